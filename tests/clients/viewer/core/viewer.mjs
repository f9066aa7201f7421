// viewer.mjs VIEWER.WASM SAMPLES: what WebAssembly makes of the characters that writeSamples has left has the bits of the
// native build; damaged blocks are answered with a text, and a thousand frames leave the memory as it was.
import assert from 'node:assert/strict';
import { readFileSync, readdirSync } from 'node:fs';

const [wasmPath, samples] = process.argv.slice(2);
const code = new WebAssembly.Module(readFileSync(wasmPath));
const counts = ['vertices', 'drawVertices', 'triangles', 'frames', 'sliders', 'controls', 'checks', 'target', 'errors', 'rig'];

class Core {
  constructor() {
    this.e = new WebAssembly.Instance(code, {}).exports;
    this.e._initialize();
  }
  copyIn(bytes) {
    const at = this.e.nw_allocate(bytes.length);
    new Uint8Array(this.e.memory.buffer).set(bytes, at);
    return at;
  }
  add(name, bytes) {
    const at = this.copyIn(Buffer.from(name));
    this.e.nw_add_block(at, Buffer.byteLength(name), this.copyIn(bytes), bytes.length);
    this.e.nw_release(at);
  }
  sum(name) {
    const at = this.copyIn(Buffer.from(name));
    const sum = BigInt.asUintN(64, this.e.nw_block_sum(at, Buffer.byteLength(name)));
    this.e.nw_release(at);
    return sum.toString(16);
  }
  count(what) { return this.e.nw_count(counts.indexOf(what)); }
  bytes(at, size) { return at === 0 ? Buffer.alloc(0) : Buffer.from(new Uint8Array(this.e.memory.buffer, at, size)); }
  shown(what, shape) {
    const each = { points: 12, errors: 4, draw_points: 12, draw_normals: 12, draw_errors: 4 }[what];
    const many = this.count(what.startsWith('draw') ? 'drawVertices' : 'vertices');
    return this.bytes(this.e[`nw_${what}`](shape), each * many);
  }
  error() {
    const memory = Buffer.from(this.e.memory.buffer);
    const at = this.e.nw_error();
    return memory.toString('utf8', at, memory.indexOf(0, at));
  }
  slide(frame, values) {
    const at = this.copyIn(new Uint8Array(Float64Array.from(values).buffer));
    const shown = this.e.nw_show_sliders(frame, at);
    this.e.nw_release(at);
    return shown;
  }
}

const blocksOf = (folder) => Object.fromEntries(
  readdirSync(`${folder}/blocks`).map((name) => [name, readFileSync(`${folder}/blocks/${name}`)]));

function opened(blocks, sums) {
  const core = new Core();
  for (const [name, bytes] of Object.entries(blocks)) {
    core.add(name, bytes);
    if (sums) assert.equal(core.sum(name), sums[name], name);
  }
  assert.equal(core.e.nw_open(), 1);
  if (sums) for (const name of Object.keys(blocks)) assert.equal(core.sum(name), sums[name], `${name}, when it is open`);
  assert.equal(core.sum('no block'), '0');
  return core;
}

// The text of a character that cannot be opened.
function refusal(blocks) {
  const core = new Core();
  assert.throws(() => {
    for (const [name, bytes] of Object.entries(blocks)) core.add(name, bytes);
    core.e.nw_open();
  }, WebAssembly.RuntimeError);
  const text = core.error();
  assert.equal(core.e.nw_show_frame(0), 0);
  return text;
}

const floats = (bytes) => new Float32Array(bytes.buffer.slice(bytes.byteOffset, bytes.byteOffset + bytes.length));

function compareSliders(core, folder, sliders) {
  assert.equal(core.slide(2, sliders), 1);
  const near = (what, found, expected) => {
    assert.equal(found.length, expected.length, what);
    floats(found).forEach((x, i) => assert.ok(Math.abs(x - floats(expected)[i]) <= 1e-6 * 8, `${folder} ${what} ${i}`));
  };
  near('controls', core.bytes(core.e.nw_controls(), 4 * core.count('controls')), readFileSync(`${folder}/sliders.controls`));
  for (const shape of [0, 1])
    near('points', core.shown('points', shape), readFileSync(`${folder}/sliders.${shape}.points`));
  assert.equal(core.e.nw_errors(0), 0);
  sliders[1] = NaN;
  assert.equal(core.slide(0, sliders), 0);
  assert.match(core.error(), /slider is not finite/);
}

assert.deepEqual(WebAssembly.Module.imports(code), []);
for (const sample of readdirSync(samples)) {
  const folder = `${samples}/${sample}`;
  const blocks = blocksOf(folder);
  const sums = Object.fromEntries(readFileSync(`${folder}/sums`, 'utf8').trim().split('\n').map((line) => line.split(' ')));
  const core = opened(blocks, sums);
  const settings = new Uint32Array(blocks.settings.buffer.slice(blocks.settings.byteOffset, blocks.settings.byteOffset + 64));
  assert.deepEqual(['vertices', 'frames', 'sliders', 'controls'].map((what) => core.count(what)),
    [1, 7, 11, 6].map((i) => settings[i]));
  let compared = 0;
  for (let frame = 0; frame < core.count('frames'); ++frame) {
    assert.equal(core.e.nw_show_frame(frame), 1);
    for (const what of ['points', 'errors', 'draw_points', 'draw_normals', 'draw_errors'])
      for (const shape of [0, 1, 2]) {
        const expected = readFileSync(`${folder}/frame${frame}.${shape}.${what}`);
        assert.ok(core.shown(what, shape).equals(expected), `${folder}: frame ${frame}, ${what} ${shape}`);
        compared += expected.length;
      }
  }
  assert.ok(compared > 0);
  assert.deepEqual([0, 1, 2].map((i) => core.e.nw_check(i)), [1, 1, 0]);
  assert.equal(core.e.nw_show_frame(99), 0);
  assert.equal(core.error(), 'frame 99 is none of 4');
  if (core.count('rig') === 1)
    compareSliders(core, folder, new Float64Array(blocks['frames.sliders'].buffer.slice(blocks['frames.sliders'].byteOffset,
      blocks['frames.sliders'].byteOffset + 8 * core.count('sliders'))));

  // a thousand frames, and poses of sliders between them
  const show = (i) => {
    core.e.nw_show_frame(i % 4);
    if (core.count('rig') === 1) core.slide(i % 4, new Array(core.count('sliders')).fill(i / 1000));
    for (const shape of [0, 1, 2]) for (const what of ['draw_normals', 'draw_errors']) core.shown(what, shape);
  };
  for (let i = 0; i < 8; ++i) show(i);
  const before = core.e.memory.buffer.byteLength;
  for (let i = 0; i < 1000; ++i) show(i);
  assert.equal(core.e.memory.buffer.byteLength, before);

  // one bit of what is computed from, and sums that are not the page's
  const changed = blocks['basis.values'] ? 'basis.values' : 'network.constants';
  const flipped = { ...blocks, [changed]: Buffer.from(blocks[changed]) };
  flipped[changed][1] ^= 64;
  assert.throws(() => opened(flipped, sums), new RegExp(changed));
  if (blocks['basis.values']) assert.equal(opened(flipped).e.nw_check(0), 0);

  for (const [name, bytes] of Object.entries(blocks)) {
    const { [name]: gone, ...others } = blocks;
    if (['mesh.rest', 'settings', 'network.words', 'frames.controls', 'scale'].includes(name))
      assert.equal(refusal(others), `the block "${name}" is missing`);
    if (!['basis.scales', 'rig.limits', 'frames.sliders'].includes(name))
      assert.match(refusal({ ...blocks, [name]: bytes.subarray(1) }), new RegExp(`^the block "${name}"`));
  }
  const tooLarge = { ...blocks, settings: Buffer.from(blocks.settings) };
  tooLarge.settings.writeUInt32LE(0x7fffffff, 4);
  assert.match(refusal(tooLarge), /numbers, and \d{10,} are needed/);
  console.log(`${sample}: ${compared} bytes are the native build's; memory ${before} before and after a thousand frames`);
}
