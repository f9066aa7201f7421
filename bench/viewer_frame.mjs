// viewer_frame.mjs VIEWER.WASM BLOCKS SECONDS: lines of "what median" in ms of processor time, of a page's core under
// node. For bench_viewer.
import { readFileSync, readdirSync } from 'node:fs';

const [wasmPath, folder, seconds] = process.argv.slice(2);
const { exports: core } = new WebAssembly.Instance(new WebAssembly.Module(readFileSync(wasmPath)), {});
core._initialize();

function copyIn(bytes) {
  const at = core.nw_allocate(bytes.length);
  new Uint8Array(core.memory.buffer).set(bytes, at);
  return at;
}

function median(forSeconds, body) {
  const times = [];
  const end = performance.now() + 1000 * forSeconds;
  for (let i = 0; performance.now() < end || times.length < 1; ++i) {
    const start = process.cpuUsage();
    body(i);
    const spent = process.cpuUsage(start);
    times.push((spent.user + spent.system) / 1000);
  }
  times.sort((a, b) => a - b);
  return times[times.length >> 1];
}

for (const name of readdirSync(folder)) {
  const text = Buffer.from(name);
  const bytes = readFileSync(`${folder}/${name}`);
  core.nw_add_block(copyIn(text), text.length, copyIn(bytes), bytes.length);
}
console.log('open', median(0, () => core.nw_open()));
const frames = core.nw_count(3);
const sliders = core.nw_count(4);
const values = core.nw_allocate(8 * sliders);
for (let i = 0; i < 40; ++i) core.nw_show_frame(i % frames); // until it is compiled with all care
console.log('frame', median(seconds, (i) => core.nw_show_frame(i % frames)));
console.log('sliders', median(seconds, (i) => {
  new Float64Array(core.memory.buffer, values, sliders).fill(0.001 * (i % 100));
  core.nw_show_sliders(0, values);
}));
console.log('normals', median(seconds, (i) => {
  core.nw_show_frame(i % frames);
  core.nw_draw_normals(1);
}));
