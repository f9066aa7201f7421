// SPDX-License-Identifier: Apache-2.0
// Draws the character with WebGL 2: up to two shapes side by side, of which each has its own arrays on the device.
import {
  BufferAttribute, BufferGeometry, DynamicDrawUsage, LineBasicMaterial, LineSegments, Mesh, Scene, WebGLRenderer,
} from 'three';
import { surfaceMaterial } from './surface.js';

export class Stage {
  name = 'webgl2';
  onTurn = () => {};
  #core;
  #sides = [];
  #pictures = null; // materials with textures, and the parts of the mesh that have them

  /** Null where the browser has no WebGL 2. */
  static make(core, camera) {
    const canvas = document.createElement('canvas');
    const context = canvas.getContext('webgl2', { alpha: true, antialias: true, depth: true, powerPreference: 'high-performance' });
    return context && new Stage(core, camera, canvas, context);
  }

  constructor(core, camera, canvas, context) {
    this.#core = core;
    this.camera = camera;
    this.renderer = new WebGLRenderer({ canvas, context });
    this.renderer.autoClear = false;
    this.element = this.renderer.domElement;
    this.element.addEventListener('webglcontextrestored', () => this.onTurn());
    this.triangles = new BufferAttribute(core.triangles().slice(), 1);
    this.plain = surfaceMaterial();
    this.lines = new LineBasicMaterial({ color: 0x202226, transparent: true, opacity: 0.45 });
  }

  resize(width, height, ratio) {
    this.renderer.setPixelRatio(ratio);
    this.renderer.setSize(width, height, false);
    this.size = [width, height];
    this.camera.setAspect(width / height);
  }

  /** `materials`: each with the triangles that it is of; `uvs`: [2 draw vertices]. */
  setTextures(uvs, materials) {
    const parts = materials.map(({ firstTriangle, triangles }) => ({ start: 3 * firstTriangle, count: 3 * triangles }));
    this.#pictures = { uvs: new BufferAttribute(uvs, 2), parts, materials: materials.map(surfaceMaterial) };
    this.#sides.forEach((side) => side.giveTextures(this.#pictures));
  }

  /** `edges`: two draw vertices for each edge. */
  setEdges(edges) {
    this.edges = new BufferAttribute(edges, 1);
  }

  /** Draws a shape into the part of the picture that lies between `from` and `to` of its width. */
  draw({ shape, side, from, to, isHeat, range, hasEdges, hasTextures }) {
    const it = this.#side(side);
    it.fill(this.#core, shape, isHeat);
    it.show(hasTextures && !isHeat ? this.#pictures : null, hasEdges ? this.edges : null);
    this.plain.uniforms.isHeat.value = isHeat;
    this.plain.uniforms.range.value = range;
    if (side === 0) this.camera.update();
    const [width, height] = this.size;
    const left = Math.round(from * width);
    this.renderer.setScissorTest(true); // both each time: a context that was lost comes back without
    this.renderer.setClearColor(0, 0);
    this.renderer.setScissor(left, 0, Math.round(to * width) - left, height);
    this.renderer.clear();
    if (to > from) this.renderer.render(it.scene, this.camera.three);
  }

  /** Waits until what was drawn is there. */
  finish() {
    this.renderer.getContext().finish();
  }

  get memory() {
    const { geometries, textures } = this.renderer.info.memory;
    return { geometries, textures };
  }

  #side(index) {
    if (!this.#sides[index]) {
      this.#sides[index] = new Side(this.#core.count.drawVertices, this.triangles, this.plain, this.lines);
      if (this.#pictures) this.#sides[index].giveTextures(this.#pictures);
    }
    return this.#sides[index];
  }
}

// one shape as it is drawn
class Side {
  scene = new Scene();

  constructor(vertices, triangles, material, lines) {
    const array = (length, width) => new BufferAttribute(new Float32Array(length), width).setUsage(DynamicDrawUsage);
    this.geometry = new BufferGeometry();
    this.geometry.setIndex(triangles);
    this.geometry.setAttribute('position', array(3 * vertices, 3));
    this.geometry.setAttribute('normal', array(3 * vertices, 3));
    this.geometry.setAttribute('distanceToTarget', array(vertices, 1));
    this.plain = material;
    this.lines = lines;
    this.mesh = new Mesh(this.geometry, material);
    this.mesh.frustumCulled = false; // the points move
    this.scene.add(this.mesh);
  }

  giveTextures({ uvs, parts }) {
    this.geometry.setAttribute('uv', uvs);
    parts.forEach(({ start, count }, material) => this.geometry.addGroup(start, count, material));
  }

  fill(core, shape, isHeat) {
    this.#set('position', core.drawPoints(shape));
    this.#set('normal', core.drawNormals(shape));
    if (isHeat) this.#set('distanceToTarget', core.drawErrors(shape));
  }

  #set(name, values) {
    if (!values) return;
    const attribute = this.geometry.getAttribute(name);
    attribute.array.set(values);
    attribute.needsUpdate = true;
  }

  show(pictures, edges) {
    this.mesh.material = pictures ? pictures.materials : this.plain;
    if (edges && !this.wires) this.#addWires(edges);
    if (this.wires) this.wires.visible = edges !== null;
  }

  #addWires(edges) {
    const geometry = new BufferGeometry();
    geometry.setIndex(edges);
    geometry.setAttribute('position', this.geometry.getAttribute('position'));
    this.wires = new LineSegments(geometry, this.lines);
    this.wires.frustumCulled = false;
    this.scene.add(this.wires);
  }
}
