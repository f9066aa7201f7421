// SPDX-License-Identifier: Apache-2.0
// The controls of the rig, grouped by joint, within their limits. Angles are shown in degrees and kept in radians.
import { byId, make, say } from './elements.js';
import { digits } from './format.js';

const degrees = 180 / Math.PI;
const fewSliders = 12; // of which all are seen at once
const followEvery = 100; // milliseconds, while the motion plays

export class Sliders {
  /** `motion`: the values of each frame, one for each slider; `onMove` is called when the user takes over. */
  constructor(view, motion, onMove) {
    this.view = view;
    this.motion = motion;
    this.onMove = onMove;
    this.all = view.core.count.hasRig && motion ? view.manifest.sliders : [];
    this.numberOf = new Map(this.all.map(({ name }, i) => [name, i]));
    this.rows = [];
    this.followed = 0;
    if (this.all.length) this.#build();
    else this.#sayWhyNone();
    view.onDraw.push(() => this.#follow());
  }

  /** The value of each slider in what is shown, in the scene's units. */
  get values() {
    const { frame, pose } = this.view;
    const count = this.all.length;
    return pose ?? this.motion?.subarray(frame * count, (frame + 1) * count) ?? [];
  }

  /** Sets the slider of that name, or says false. */
  set(name, value) {
    const number = this.numberOf.get(name);
    if (number === undefined || !Number.isFinite(value)) return false;
    this.#setValue(number, value);
    return true;
  }

  reset() {
    this.view.showPose(null);
  }

  rest() {
    this.onMove();
    this.view.showPose(Float64Array.from(this.all, ({ rest }) => rest ?? 0));
  }

  #setValue(number, value) {
    const pose = this.view.pose ?? Float64Array.from(this.values);
    pose[number] = value;
    this.onMove();
    this.view.showPose(pose);
  }

  #sayWhyNone() {
    byId('slider-tools').hidden = true;
    byId('why-no-sliders').hidden = false;
    say(byId('why-no-sliders'), this.view.manifest.whyNoSliders || 'This rig has no controls that a slider could set.');
  }

  #build() {
    const groups = grouped(this.all);
    for (const [group, numbers] of groups) {
      const rows = numbers.map((i) => this.#row(i));
      const details = make('details', { open: this.all.length <= fewSliders }, make('summary', { text: group || 'Others' }), ...rows);
      byId('sliders').append(details);
    }
    byId('search').addEventListener('input', () => this.#search(byId('search').value));
    byId('to-motion').addEventListener('click', () => this.reset());
    byId('to-rest').addEventListener('click', () => this.rest());
  }

  #row(number) {
    const { name, group, isAngle } = this.all[number];
    const [least, most] = this.#limits(number);
    const scale = isAngle ? degrees : 1;
    const short = group && name.startsWith(`${group}.`) ? name.slice(group.length + 1) : name;
    const input = make('input', { type: 'range', step: 'any', min: String(least * scale), max: String(most * scale) });
    const label = make('span', { text: short, title: `${name}: double click sets it back` });
    const output = make('output');
    input.setAttribute('aria-label', name);
    input.addEventListener('input', () => this.#setValue(number, input.valueAsNumber / scale));
    label.addEventListener('dblclick', () => this.#setValue(number, this.#ofMotion(number)));
    const element = make('div', { className: 'slider' }, label, input, output);
    this.rows[number] = { element, input, output, scale, unit: isAngle ? '°' : '' };
    return element;
  }

  #limits(number) {
    const { least, most, isAngle } = this.all[number];
    const free = isAngle ? Math.PI : 1;
    return [Number.isFinite(least) ? least : -free, Number.isFinite(most) ? most : free];
  }

  #ofMotion(number) {
    return this.motion[this.view.frame * this.all.length + number];
  }

  #search(text) {
    const words = text.toLowerCase().split(/\s+/).filter(Boolean);
    const fits = ({ name, group }) => words.every((word) => `${group} ${name}`.toLowerCase().includes(word));
    this.rows.forEach(({ element }, i) => {
      element.hidden = !fits(this.all[i]);
    });
    for (const details of byId('sliders').children) {
      const found = details.querySelector('.slider:not([hidden])') !== null;
      details.hidden = !found;
      if (words.length) details.open = found;
    }
  }

  // while the motion plays, ten times a second are enough
  #follow() {
    const now = performance.now();
    const { frame, pose } = this.view;
    clearTimeout(this.later);
    if (now - this.followed < followEvery) {
      this.later = setTimeout(() => this.#follow(), followEvery);
      return;
    }
    if (frame === this.shownFrame && pose === this.shownPose && !pose) return;
    [this.followed, this.shownFrame, this.shownPose] = [now, frame, pose];
    byId('to-motion').disabled = pose === null;
    const values = this.values;
    this.rows.forEach((row, i) => showValue(row, values[i], pose !== null && values[i] !== this.#ofMotion(i)));
  }
}

function showValue({ element, input, output, scale, unit }, value, isMoved) {
  const shown = value * scale;
  if (input.valueAsNumber !== shown) input.value = String(shown);
  say(output, unit ? `${shown.toFixed(1)}${unit}` : digits(shown));
  element.toggleAttribute('data-moved', isMoved);
}

function grouped(all) {
  const groups = new Map();
  all.forEach(({ group }, i) => groups.set(group, [...(groups.get(group) ?? []), i]));
  return groups;
}
