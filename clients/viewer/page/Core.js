// SPDX-License-Identifier: Apache-2.0
// The core of the page: WebAssembly of the same sources that quarn is built from. It imports nothing; what it gives are
// pointers into its memory, of which views are made here and made again when the memory has grown.
import { decode, decodedSize, decodeInto } from './base64.js';
import { Failure } from './Failure.js';

export const shapes = { skin: 0, neural: 1, target: 2 };
const counts = ['vertices', 'drawVertices', 'triangles', 'frames', 'sliders', 'controls', 'checks', 'hasTarget',
  'hasErrors', 'hasRig'];

export class Core {
  #exports;
  #views = new Map();

  /** `text`: base64 of viewer.wasm. */
  static async start(text) {
    if (typeof WebAssembly !== 'object') throw new Failure('This browser has no WebAssembly, which computes the character.');
    const { instance } = await WebAssembly.instantiate(decode(text), {});
    instance.exports._initialize();
    return new Core(instance.exports);
  }

  constructor(exports) {
    this.#exports = exports;
  }

  get memory() {
    return this.#exports.memory;
  }

  /** Hands over a block as its base64, in which it may be damaged: then nothing is added and the answer is null. Else the
   *  sum of its bytes, 16 hexadecimal digits. */
  addBlock(name, text) {
    const size = decodedSize(text);
    if (!Number.isInteger(size) || size < 0) return null;
    return this.#guarded(() => {
      const bytes = this.#allocate(size);
      try {
        decodeInto(text, new Uint8Array(this.memory.buffer, bytes, size));
      } catch {
        this.#exports.nw_release(bytes);
        return null;
      }
      return this.#withName(name, (at, length) => {
        this.#exports.nw_add_block(at, length, bytes, size);
        return hexOf(this.#exports.nw_block_sum(at, length));
      });
    });
  }

  /** Makes the character of the blocks. Throws a Failure with what the core says of them. */
  open() {
    this.#ask(() => this.#exports.nw_open());
    this.count = {};
    counts.forEach((name, what) => {
      this.count[name] = this.#exports.nw_count(what);
    });
  }

  showFrame(frame) {
    this.#ask(() => this.#exports.nw_show_frame(frame));
  }

  /** `values`: one for each slider, in the scene's units. */
  showSliders(frame, values) {
    this.#ask(() => {
      this.#sliderMemory ??= this.#allocate(8 * values.length);
      this.#view('sliders', Float64Array, this.#sliderMemory, values.length).set(values);
      return this.#exports.nw_show_sliders(frame, this.#sliderMemory);
    });
  }
  #sliderMemory;

  setEnvelope(factor) {
    this.#guarded(() => this.#exports.nw_set_envelope(factor));
  }

  /** Whether the points of a stored frame have the bits of the native build. That frame is shown from then on. */
  check(index) {
    return this.#guarded(() => this.#exports.nw_check(index) === 1);
  }

  // views that hold until the next call; null where there is nothing of that kind
  triangles = () => this.#array('nw_triangles', Uint32Array, 3 * this.count.triangles);
  points = (shape) => this.#array('nw_points', Float32Array, 3 * this.count.vertices, shape);
  drawPoints = (shape) => this.#array('nw_draw_points', Float32Array, 3 * this.count.drawVertices, shape);
  drawNormals = (shape) => this.#array('nw_draw_normals', Float32Array, 3 * this.count.drawVertices, shape);
  errors = (shape) => this.#array('nw_errors', Float32Array, this.count.vertices, shape);
  drawErrors = (shape) => this.#array('nw_draw_errors', Float32Array, this.count.drawVertices, shape);

  /** A picture without WebGL, RGBA from the top: see clients/viewer/core/viewer/Raster.h. */
  raster({ width, height, matrices, shape, isHeat, range, colour, left, right }) {
    return this.#guarded(() => {
      this.#matrixMemory ??= this.#allocate(4 * 32);
      this.#view('matrices', Float32Array, this.#matrixMemory, 32).set(matrices);
      const picture = this.#exports.nw_raster(width, height, this.#matrixMemory, shapes[shape], isHeat ? 1 : 0, range,
        colour, left, right);
      return picture && this.#view('raster', Uint8ClampedArray, picture, 4 * width * height);
    });
  }
  #matrixMemory;

  #array(name, Type, length, shape) {
    return this.#guarded(() => {
      const at = shape === undefined ? this.#exports[name]() : this.#exports[name](shapes[shape]);
      return at ? this.#view(name + shape, Type, at, length) : null;
    });
  }

  // one view for each use, made again only when it has moved: a frame leaves no garbage
  #view(use, Type, at, length) {
    const known = this.#views.get(use);
    if (known && known.buffer === this.memory.buffer && known.byteOffset === at && known.length === length) return known;
    const view = new Type(this.memory.buffer, at, length);
    this.#views.set(use, view);
    return view;
  }

  #withName(name, use) {
    const bytes = new TextEncoder().encode(name);
    const at = this.#allocate(bytes.length);
    new Uint8Array(this.memory.buffer, at, bytes.length).set(bytes);
    try {
      return use(at, bytes.length);
    } finally {
      this.#exports.nw_release(at);
    }
  }

  #allocate(bytes) {
    const at = this.#exports.nw_allocate(Math.max(1, bytes));
    if (!at) throw new Failure(`There is no memory for ${bytes} bytes more.`);
    return at;
  }

  // a call that answers 1, or 0 and a text
  #ask(call) {
    if (this.#guarded(call) !== 1) throw new Failure(this.#errorText() || 'The core refuses this without a word.');
  }

  // what the core throws ends it, with its text left behind
  #guarded(call) {
    try {
      return call();
    } catch (error) {
      if (!(error instanceof WebAssembly.RuntimeError)) throw error;
      throw new Failure(this.#errorText() || `The core had to stop (${error.message}); reload the page to begin anew.`);
    }
  }

  #errorText() {
    const bytes = new Uint8Array(this.memory.buffer, this.#exports.nw_error());
    return new TextDecoder().decode(bytes.subarray(0, bytes.indexOf(0)));
  }
}

function hexOf(sum) {
  return BigInt.asUintN(64, sum).toString(16).padStart(16, '0');
}
