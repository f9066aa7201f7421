// SPDX-License-Identifier: Apache-2.0
// layer.mjs make CACHE.npy FRAMES: points of any size for the strip of the example of the wave, by a fixed sequence.
// layer.mjs check LAYER.usda CACHE.npy TEXT...: the layer has the cache's points to the bit, their boxes, the strip's
// polygons, and each TEXT. Exit status 1, and a sentence, where it has not.
// layer.mjs character FILE.gltf: two quads side by side, cut into triangles, apart at a seam of their picture.
// layer.mjs uvs LAYER.usda: it has this mesh with the texture coordinates of every corner, to the bit.
import { readFileSync, writeFileSync } from "node:fs";

const vertexCount = 369;

function fail(sentence) {
  console.error(sentence);
  process.exit(1);
}

function make(path, frameCount) {
  const numbers = new Float32Array(frameCount * vertexCount * 3);
  let state = 1;
  const next = () => (state = (Math.imul(state, 1664525) + 1013904223) >>> 0) / 2 ** 32;
  // down to what rounds to nothing in %g of fewer digits, and far beyond what a mesh has
  numbers.forEach((_, i) => (numbers[i] = (next() - 0.5) * 10 ** (40 * next() - 30)));
  const shape = `(${frameCount}, ${vertexCount}, 3)`;
  const head = `{'descr': '<f4', 'fortran_order': False, 'shape': ${shape}, }`.padEnd(117) + "\n";
  const start = Buffer.from([0x93, 0x4e, 0x55, 0x4d, 0x50, 0x59, 1, 0, 118, 0]);
  writeFileSync(path, Buffer.concat([start, Buffer.from(head), Buffer.from(numbers.buffer)]));
}

function readCache(path) {
  const file = readFileSync(path);
  const begin = 10 + file.readUInt16LE(8);
  return new Float32Array(file.buffer.slice(file.byteOffset + begin, file.byteOffset + file.length));
}

// the layer as the parser understands it: it is a program for browsers, and has to find one
async function textOf(path) {
  globalThis.window = globalThis.self = globalThis;
  globalThis.document = { currentScript: { src: "" } };
  Object.defineProperty(process, "type", { value: "renderer" });
  const folder = new URL("../../../build/deps/tinyusdz/", import.meta.url);
  const { default: start } = await import(new URL("tinyusdz.mjs", folder));
  const usd = await start({ wasmBinary: readFileSync(new URL("tinyusdz.wasm", folder)) });
  const loader = new usd.TinyUSDZLoaderNative();
  if (!loader.loadAsLayerFromBinary(readFileSync(path), path)) fail(`${path}: ${loader.error()}`);
  return loader.layerToString();
}

const numbersIn = (text) => Float32Array.from(text.match(/[-+.\w]+/g), Number);

// the samples of an attribute, by time code
function samplesOf(text, attribute) {
  const [, body] = text.match(new RegExp(`${attribute}\\.timeSamples = {([^}]*)}`)) ?? fail(`no ${attribute}`);
  return [...body.matchAll(/(-?\d+): \[([^\]]*)\]/g)].map(([, code, list]) => [Number(code), numbersIn(list)]);
}

function listOf(text, attribute) {
  return numbersIn((text.match(new RegExp(`${attribute} = \\[([^\\]]*)\\]`)) ?? fail(`no ${attribute}`))[1]);
}

function requireEqual(what, got, wanted) {
  const bits = (numbers) => Buffer.from(Float32Array.from(numbers).buffer);
  if (!bits(got).equals(bits(wanted))) fail(`${what} is ${got.slice(0, 9)}..., not ${wanted.slice(0, 9)}...`);
}

function boxOf(points) {
  const of = (axis) => points.filter((_, i) => i % 3 === axis);
  const corner = (extreme) => [0, 1, 2].map((axis) => of(axis).reduce((a, b) => extreme(a, b)));
  return [...corner(Math.min), ...corner(Math.max)];
}

async function check(layer, cache, ...texts) {
  const text = await textOf(layer);
  for (const wanted of texts) if (!text.includes(wanted + "\n")) fail(`no ${wanted} in\n${text.slice(0, 900)}`);
  const first = Number(text.match(/startTimeCode = (-?\d+)/)[1]);
  const last = Number(text.match(/endTimeCode = (-?\d+)/)[1]);
  const points = readCache(cache);
  const frameCount = points.length / 3 / vertexCount;
  const boxes = samplesOf(text, "extent");
  const samples = samplesOf(text, "points");
  if (samples.length !== frameCount || boxes.length !== frameCount) fail(`${samples.length} samples`);
  samples.forEach(([code, numbers], i) => {
    const frame = points.subarray(3 * vertexCount * i, 3 * vertexCount * (i + 1));
    requireEqual("time code", [code, boxes[i][0]], Array(2).fill(first + (i * (last - first)) / (frameCount - 1)));
    requireEqual(`point of ${code}`, numbers, frame);
    requireEqual(`extent of ${code}`, boxes[i][1], boxOf(frame));
  });
  const counts = listOf(text, "faceVertexCounts");
  const corners = listOf(text, "faceVertexIndices");
  requireEqual("faceVertexCounts", counts, Array(320).fill(4));
  if (corners.length !== 1280 || new Set(corners).size !== vertexCount || Math.max(...corners) >= vertexCount)
    fail(`${corners.length} corners`);
}

const quads = {
  points: [0, 0, 0, 1, 0, 0, 1, 1, 0, 0, 1, 0, 1, 0, 0, 2, 0, 0, 2, 1, 0, 1, 1, 0],
  uvs: [0, 0.1, 0.3, 0.1, 0.3, 0.95, 0, 0.95, 0.3, 0.1, 1, -3.7, 1e-5, 0.6, 0.7, 0.6],
  corners: [0, 1, 2, 0, 2, 3, 4, 5, 6, 4, 6, 7],
};

function character(path) {
  const lists = [Float32Array.from(quads.points), Float32Array.from(quads.uvs), Uint32Array.from(quads.corners)];
  const bytes = Buffer.concat(lists.map((list) => Buffer.from(list.buffer)));
  let end = 0;
  const bufferViews = lists.map(({ byteLength }) => {
    end += byteLength;
    return { buffer: 0, byteOffset: end - byteLength, byteLength };
  });
  const accessor = (bufferView, type, componentType, count) => ({ bufferView, type, componentType, count });
  const gltf = {
    asset: { version: "2.0" },
    scene: 0,
    scenes: [{ nodes: [0] }],
    nodes: [{ name: "sheet", mesh: 0 }],
    meshes: [{ primitives: [{ attributes: { POSITION: 0, TEXCOORD_0: 1 }, indices: 2 }] }],
    accessors: [accessor(0, "VEC3", 5126, 8), accessor(1, "VEC2", 5126, 8), accessor(2, "SCALAR", 5125, 12)],
    bufferViews,
    buffers: [{ byteLength: end, uri: `data:application/octet-stream;base64,${bytes.toString("base64")}` }],
  };
  writeFileSync(path, JSON.stringify(gltf));
}

async function checkUvs(layer) {
  const text = await textOf(layer);
  if (!/primvars:st = [^(]*\([^)]*\).*interpolation = "faceVarying"/s.test(text)) fail(`no primvars:st in\n${text}`);
  const uvs = listOf(text, "primvars:st");
  const indices = listOf(text, "primvars:st:indices");
  const points = samplesOf(text, "points")[0][1];
  const at = (list, width, index) => [...list.subarray(width * index, width * (index + 1))];
  const corners = [...listOf(text, "faceVertexIndices")].map((vertex) => at(points, 3, vertex));
  requireEqual("points", [points.length], [18]);
  const wanted = quads.corners.flatMap((vertex) => at(Float32Array.from(quads.points), 3, vertex));
  requireEqual("corners", corners.flat(), wanted);
  const texture = quads.corners.flatMap((vertex) => {
    const [u, v] = at(Float32Array.from(quads.uvs), 2, vertex);
    return [u, Math.fround(1 - v)];
  });
  requireEqual("primvars:st", [...indices].flatMap((index) => at(uvs, 2, index)), texture);
}

const [, , mode, ...words] = process.argv;
if (mode === "make") make(words[0], Number(words[1]));
else if (mode === "character") character(words[0]);
else if (mode === "uvs") await checkUvs(words[0]);
else await check(...words);
