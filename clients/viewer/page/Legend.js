// SPDX-License-Identifier: Apache-2.0
// The scale of the heat map, and a pin at a vertex that is pointed at.
import { Vector3 } from 'three';
import { byId, make, say } from './elements.js';
import { heatGradient } from './heat.js';
import { digits, mm } from './format.js';

export class Legend {
  constructor(view) {
    const { errors } = view.manifest;
    if (errors) {
      const range = errors.rangeMm;
      const most = Math.max(errors.before.maxMm, errors.after.maxMm) > range ? `≥ ${mm(range)}` : mm(range);
      byId('legend-scale').style.background = heatGradient();
      byId('legend-numbers').append(...['0', digits(range / 2), most].map((text) => make('span', { text })));
    }
    view.onDraw.push(() => this.#follow(view));
  }

  #follow(view) {
    byId('legend').hidden = view.heat === 'off';
    say(byId('legend-title'), view.hasErrors ? 'Distance to the target' : 'No colours: the target is known in the poses of the motion only');
  }
}

export class Pin {
  #point = new Vector3();

  constructor(view, camera) {
    this.view = view;
    this.camera = camera;
    view.onDraw.push(() => this.#follow());
  }

  #follow() {
    const { pin, core, shapes } = this.view;
    const element = byId('pin');
    const points = pin >= 0 && shapes.length === 1 && core.points(shapes[0]);
    element.hidden = !points;
    if (!points) return;
    this.#point.fromArray(points, 3 * pin).project(this.camera.three);
    element.style.left = `${50 + 50 * this.#point.x}%`;
    element.style.top = `${50 - 50 * this.#point.y}%`;
    const errors = this.view.hasErrors && shapes[0] !== 'target' ? core.errors(shapes[0]) : null;
    say(element.querySelector('span'), errors ? `vertex ${pin}, ${mm(errors[pin])}` : `vertex ${pin}`);
  }
}
