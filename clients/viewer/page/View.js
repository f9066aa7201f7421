// SPDX-License-Identifier: Apache-2.0
// What is shown: the frame or a pose of the user's own, of which shapes, with which colours. It computes when it draws.

export const modes = ['neural', 'skin', 'target', 'split', 'flip'];
const errorOf = { skin: 'before', neural: 'after' };
const shapeOf = { before: 'skin', after: 'neural' };

export class View {
  frame = 0;
  pose = null; // a value for each slider, where the user has moved one
  mode = 'neural';
  sides = ['skin', 'neural']; // of split and flip
  heat = 'off';
  split = 0.5;
  envelope = 1;
  hasEdges = false;
  hasTextures = true;
  pin = -1; // a vertex of the mesh that is pointed at
  frameMs = 0; // what the core takes, a moving average
  onDraw = []; // called after each picture
  onFailure = [];
  #isFlipped = false;
  #isPeeking = false;
  #isStale = true;
  #asked = 0;

  constructor(core, manifest, stage) {
    this.core = core;
    this.manifest = manifest;
    this.stage = stage;
    stage.onTurn = () => this.ask();
  }

  showFrame(frame) {
    const last = this.core.count.frames - 1;
    this.frame = Math.max(0, Math.min(last, Math.trunc(frame) || 0));
    this.pose = null;
    this.pin = -1;
    this.#computeAnew();
  }

  /** `values`: one for each slider, in the scene's units; null for the motion's own. */
  showPose(values) {
    this.pose = values;
    this.#computeAnew();
  }

  setEnvelope(factor) {
    this.envelope = Math.max(0, Math.min(1, Number(factor) || 0));
    this.core.setEnvelope(this.envelope);
    this.#computeAnew();
  }

  setMode(mode) {
    if (!this.canShow(mode)) return;
    this.mode = mode;
    this.#isFlipped = false;
    if (this.heat !== 'off') this.heat = errorOf[mode] ?? this.heat;
    this.ask();
  }

  setSide(side, shape) {
    this.sides[side] = shape;
    this.ask();
  }

  /** The error of a shape is drawn on that shape: of one that is shown alone, it decides which. */
  setHeat(heat) {
    if (heat !== 'off' && !this.core.count.hasErrors) return;
    this.heat = heat;
    if (heat !== 'off' && !this.isTwoSided) this.mode = shapeOf[heat];
    this.ask();
  }

  setSplit(part) {
    this.split = Math.max(0, Math.min(1, part));
    this.ask();
  }

  /** Sets plain switches: hasEdges, hasTextures, pin. */
  set(what) {
    Object.assign(this, what);
    this.ask();
  }

  flip() {
    this.#isFlipped = !this.#isFlipped;
    this.ask();
  }

  /** While it holds, the other shape of the pair is seen. */
  peek(holds) {
    if (this.#isPeeking === holds) return;
    this.#isPeeking = holds;
    this.ask();
  }

  canShow(mode) {
    return modes.includes(mode) && (mode !== 'target' || this.core.count.hasTarget === 1);
  }

  get isTwoSided() {
    return this.mode === 'split' || this.mode === 'flip';
  }

  /** The shapes that are seen, from the left. */
  get shapes() {
    const [first, second] = this.#isPeeking ? [this.sides[1], this.sides[0]] : this.sides;
    if (this.mode === 'split') return [first, second];
    if (this.mode === 'flip') return [this.#isFlipped ? second : first];
    return [this.#isPeeking ? this.#otherOf(this.mode) : this.mode];
  }

  #otherOf(shape) {
    return shape === this.sides[0] ? this.sides[1] : this.sides[0];
  }

  /** Whether the distances to the target are known: of the motion's own poses. */
  get hasErrors() {
    return this.core.count.hasErrors === 1 && !this.pose;
  }

  ask() {
    this.#asked ||= requestAnimationFrame(() => this.draw());
  }

  #computeAnew() {
    this.#isStale = true;
    this.ask();
  }

  /** Makes the core show what this says. */
  compute() {
    if (!this.#isStale) return;
    const start = performance.now();
    if (this.pose) this.core.showSliders(this.frame, this.pose);
    else this.core.showFrame(this.frame);
    this.#isStale = false;
    const took = performance.now() - start;
    this.frameMs = this.frameMs ? 0.9 * this.frameMs + 0.1 * took : took;
  }

  /** To be called where something else has made the core show another frame. */
  forget() {
    this.#isStale = true;
  }

  draw() {
    cancelAnimationFrame(this.#asked);
    this.#asked = 0;
    try {
      this.compute();
      this.#drawSides();
    } catch (error) {
      this.onFailure.forEach((tell) => tell(error));
      return;
    }
    this.tell();
  }

  /** Tells who follows what is shown. */
  tell() {
    this.onDraw.forEach((follow) => follow(this));
  }

  #drawSides() {
    const look = { range: this.manifest.errors?.rangeMm || 1, hasEdges: this.hasEdges, hasTextures: this.hasTextures };
    const seen = this.shapes;
    seen.forEach((shape, side) => {
      look.shape = shape;
      look.isHeat = this.heat !== 'off' && this.hasErrors && shape in errorOf;
      look.from = side === 0 ? 0 : this.split;
      look.to = seen.length === 2 && side === 0 ? this.split : 1;
      look.side = side;
      this.stage.draw(look);
    });
  }
}
