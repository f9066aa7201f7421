// SPDX-License-Identifier: Apache-2.0
// The time line: playing, stepping, a curve of the error over the frames, and the worst of them at a click.
import { byId, make, press, say } from './elements.js';
import { Clock } from './Clock.js';
import { mm } from './format.js';

export class TimeLine {
  /** `showWorst("before" | "after")` goes to the worst frame of the whole motion. */
  constructor(view, showWorst) {
    this.view = view;
    this.frames = view.core.count.frames;
    this.clock = new Clock(this.frames, view.manifest.framesPerSecond);
    new ErrorCurve(byId('curve'), view.manifest.frameErrors);
    this.scrub = byId('scrub');
    this.scrub.max = String(this.frames - 1);
    this.#listen();
    this.#nameTheWorst(showWorst);
    view.onDraw.push(() => this.#follow());
  }

  toggle() {
    if (this.clock.isRunning) this.stop();
    else this.play();
  }

  play() {
    if (this.frames < 2) return;
    this.clock.run(this.view.frame, performance.now());
    this.#showState();
    requestAnimationFrame((now) => this.#tick(now));
  }

  stop() {
    this.clock.stop();
    this.#showState();
  }

  step(by) {
    this.stop();
    this.view.showFrame((this.view.frame + by + this.frames) % this.frames);
  }

  goTo(frame) {
    this.stop();
    this.view.showFrame(frame);
  }

  toggleLoop() {
    this.clock.isLooping = !this.clock.isLooping;
    press(byId('loop'), this.clock.isLooping);
  }

  #tick(now) {
    if (!this.clock.isRunning) return;
    const frame = this.clock.frameAt(now);
    if (frame !== this.view.frame || this.view.pose) this.view.showFrame(frame);
    if (this.clock.isRunning) requestAnimationFrame((later) => this.#tick(later));
    else this.#showState();
  }

  #listen() {
    byId('play').addEventListener('click', () => this.toggle());
    byId('step-back').addEventListener('click', () => this.step(-1));
    byId('step-on').addEventListener('click', () => this.step(1));
    byId('loop').addEventListener('click', () => this.toggleLoop());
    this.scrub.addEventListener('input', () => this.goTo(this.scrub.valueAsNumber));
  }

  #nameTheWorst(showWorst) {
    const { errors, frames } = this.view.manifest;
    if (!errors) return;
    byId('worst').hidden = false;
    for (const when of ['before', 'after']) {
      const { worstFrame, maxMm } = errors[when];
      const button = byId(`worst-${when}`);
      button.append(`${frames[worstFrame] ?? worstFrame}`, make('span', { className: 'wide', text: `: ${mm(maxMm)}` }));
      button.addEventListener('click', () => showWorst(when));
    }
  }

  #showState() {
    byId('play').toggleAttribute('data-playing', this.clock.isRunning);
    byId('play').setAttribute('aria-label', this.clock.isRunning ? 'Pause' : 'Play');
  }

  #follow() {
    const { frame, manifest } = this.view;
    const number = manifest.frames?.[frame] ?? frame;
    say(byId('frame-number'), `Frame ${number}`);
    if (this.scrub.valueAsNumber !== frame) this.scrub.value = String(frame);
    this.scrub.setAttribute('aria-valuetext', `Frame ${number}`);
  }
}

// the largest error of each frame, before and after, drawn once for each size of the page
class ErrorCurve {
  constructor(canvas, errors) {
    this.canvas = canvas;
    this.errors = errors;
    this.most = errors ? Math.max(...errors.before.map(({ max }) => max), ...errors.after.map(({ max }) => max)) : 0;
    if (this.most > 0) say(byId('curve-top'), mm(this.most));
    new ResizeObserver(() => this.draw()).observe(canvas);
    new MutationObserver(() => this.draw()).observe(document.documentElement, { attributeFilter: ['data-theme'] });
  }

  draw() {
    const ratio = devicePixelRatio || 1;
    this.width = this.canvas.clientWidth;
    this.height = this.canvas.clientHeight;
    if (!this.width || !this.height) return;
    this.canvas.width = Math.round(this.width * ratio);
    this.canvas.height = Math.round(this.height * ratio);
    const pen = this.canvas.getContext('2d');
    pen.scale(ratio, ratio);
    const style = getComputedStyle(this.canvas);
    pen.fillStyle = style.getPropertyValue('--line');
    pen.fillRect(0, this.height - 1, this.width, 1);
    if (!this.errors || !(this.most > 0)) return;
    this.#line(pen, this.errors.before, style.getPropertyValue('--skin'));
    this.#line(pen, this.errors.after, style.getPropertyValue('--neural'));
  }

  #line(pen, errors, colour) {
    const last = Math.max(1, errors.length - 1);
    const x = (i) => 1.5 + (i / last) * (this.width - 3);
    const y = ({ max }) => this.height - 1.5 - (max / this.most) * (this.height - 5);
    pen.beginPath();
    errors.forEach((error, i) => pen.lineTo(x(i), y(error)));
    pen.strokeStyle = colour;
    pen.lineWidth = 1.5;
    pen.lineJoin = 'round';
    pen.stroke();
    pen.lineTo(x(errors.length - 1), this.height - 1);
    pen.lineTo(x(0), this.height - 1);
    pen.globalAlpha = 0.12;
    pen.fillStyle = colour;
    pen.fill();
    pen.globalAlpha = 1;
  }
}
