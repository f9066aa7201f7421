// SPDX-License-Identifier: Apache-2.0
// The row of buttons above the picture, and the names and the line in it: which shape, which colours, A against B.
import { byId, Choice, make, press, say } from './elements.js';
import { percent } from './format.js';

const names = { skin: 'Skin', neural: 'Neural', target: 'Target' };
const flipEvery = 700; // milliseconds
const calm = matchMedia('(prefers-reduced-motion: reduce)');

export class Tools {
  constructor(view) {
    this.view = view;
    this.modes = new Choice(byId('modes'), (mode) => this.choose(mode));
    this.heats = new Choice(byId('heats'), (heat) => view.setHeat(heat));
    this.modes.enable((mode) => view.canShow(mode), 'This page stores no target shapes.');
    this.heats.enable((heat) => heat === 'off' || view.core.count.hasErrors === 1, 'This page stores no distances to a target.');
    this.#offerSides();
    this.#listen();
    new Wipe(byId('wipe'), view);
    view.onDraw.push(() => this.#follow());
  }

  choose(mode) {
    if (mode === 'flip' && this.view.mode === 'flip') this.view.flip();
    else this.view.setMode(mode);
  }

  nextHeat() {
    const order = ['off', 'before', 'after'];
    this.view.setHeat(order[(order.indexOf(this.view.heat) + 1) % order.length]);
  }

  toggle(what) {
    this.view.set({ [what]: !this.view[what] });
  }

  #offerSides() {
    const offered = Object.keys(names).filter((shape) => this.view.canShow(shape));
    ['side-a', 'side-b'].forEach((id, side) => {
      byId(id).append(...offered.map((shape) => make('option', { value: shape, text: names[shape] })));
      byId(id).addEventListener('change', () => this.view.setSide(side, byId(id).value));
    });
  }

  #listen() {
    const envelope = byId('envelope');
    envelope.addEventListener('input', () => this.view.setEnvelope(envelope.valueAsNumber / 100));
    byId('edges').addEventListener('click', () => this.toggle('hasEdges'));
    byId('textures').addEventListener('click', () => this.toggle('hasTextures'));
  }

  #follow() {
    const { mode, heat, isTwoSided, shapes, envelope, hasEdges, hasTextures } = this.view;
    this.modes.press([mode]);
    this.heats.press(heat !== 'off' && isTwoSided ? ['before', 'after'] : [heat]);
    byId('sides').hidden = !isTwoSided;
    byId('stage').dataset.mode = mode;
    this.#name(mode === 'split' ? null : shapes[0]);
    const sides = mode === 'split' ? shapes : this.view.sides;
    ['side-a', 'side-b'].forEach((id, side) => {
      byId(id).value = byId(id).dataset.shape = sides[side];
    });
    say(byId('envelope-value'), percent(envelope));
    byId('envelope').value = String(100 * envelope);
    press(byId('edges'), hasEdges);
    press(byId('textures'), hasTextures);
    this.#blink(mode === 'flip' && !calm.matches);
  }

  #name(shape) {
    const tag = byId('tag');
    tag.hidden = shape === null;
    if (!shape) return;
    tag.dataset.shape = shape;
    say(tag, names[shape]);
  }

  // flipping goes by itself, for whoever did not ask the system for calm
  #blink(isOn) {
    if (isOn) {
      this.blinking ??= setInterval(() => this.view.flip(), flipEvery);
    } else {
      clearInterval(this.blinking);
      this.blinking = undefined;
    }
  }
}

// the line between two shapes, which can be dragged or moved by keys
class Wipe {
  constructor(element, view) {
    this.element = element;
    this.view = view;
    element.addEventListener('pointerdown', (event) => {
      element.setPointerCapture(event.pointerId);
      event.stopPropagation();
    });
    element.addEventListener('pointermove', (event) => {
      if (element.hasPointerCapture(event.pointerId)) this.#moveTo(event.clientX);
    });
    element.addEventListener('keydown', (event) => {
      const by = { ArrowLeft: -0.02, ArrowRight: 0.02 }[event.key];
      if (!by) return;
      view.setSplit(view.split + by);
      event.preventDefault();
      event.stopPropagation();
    });
    view.onDraw.push(() => this.#follow());
  }

  #moveTo(x) {
    const { left, width } = this.element.parentElement.getBoundingClientRect();
    this.view.setSplit((x - left) / width);
  }

  #follow() {
    const { mode, split } = this.view;
    this.element.hidden = mode !== 'split';
    if (mode !== 'split') return;
    this.element.style.left = `${100 * split}%`;
    this.element.setAttribute('aria-valuenow', String(Math.round(100 * split)));
  }
}
