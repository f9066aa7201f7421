// SPDX-License-Identifier: Apache-2.0
// Draws the character without WebGL: the core's own z-buffer, put on a plain canvas. Slower, and without textures.
import { clayNumber } from './surface.js';

const largest = 1600; // pixels on the longer side; beyond, the browser enlarges

export class Raster {
  name = 'raster';
  onTurn = () => {};
  memory = { geometries: 0, textures: 0 };
  #core;
  #matrices = new Float32Array(32);

  constructor(core, camera) {
    this.#core = core;
    this.camera = camera;
    this.element = document.createElement('canvas');
    this.context = this.element.getContext('2d');
  }

  resize(width, height, ratio) {
    const scale = Math.min(ratio, largest / Math.max(width, height));
    this.element.width = Math.max(1, Math.round(width * scale));
    this.element.height = Math.max(1, Math.round(height * scale));
    this.camera.setAspect(width / height);
  }

  setTextures() {}
  setEdges() {}
  finish() {}

  draw({ shape, side, from, to, isHeat, range }) {
    const { width, height } = this.element;
    const [left, right] = [Math.round(from * width), Math.round(to * width)];
    if (right <= left) return;
    if (side === 0) this.camera.update();
    this.#matrices.set(this.camera.three.matrixWorldInverse.elements, 0);
    this.#matrices.set(this.camera.three.projectionMatrix.elements, 16);
    const picture = this.#core.raster({ width, height, matrices: this.#matrices, shape, isHeat, range, colour: clayNumber, left, right });
    if (!picture) return;
    if (this.image?.data !== picture) this.image = new ImageData(picture, width, height);
    this.context.putImageData(this.image, 0, 0, left, 0, right - left, height);
  }
}
