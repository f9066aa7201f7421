// SPDX-License-Identifier: Apache-2.0
// The figures beside the picture: distances in this frame and over the motion, and what the model is.
import { byId, make, say } from './elements.js';
import { digits, meanAndMax, mm, percent, size } from './format.js';

const refreshEvery = 100; // milliseconds, while the motion plays

export class Numbers {
  constructor(view) {
    this.view = view;
    this.refreshed = 0;
    const { errors } = view.manifest;
    byId('numbers').hidden = !errors;
    if (errors) this.#build(errors);
    view.onDraw.push(() => this.#follow());
  }

  #build({ before, after }) {
    if (before.meanMm > 0) {
      const gain = 1 - after.meanMm / before.meanMm;
      say(byId('gain'), gain >= 0 ? `The network takes away ${percent(gain)} of the skin's mean error.`
        : `The network adds ${percent(-gain)} to the skin's mean error.`);
    }
    this.cells = ['This frame, mean', 'This frame, largest'].map((name) => {
      const cells = [make('td'), make('td')];
      byId('number-rows').append(make('tr', {}, make('th', { text: name, scope: 'row' }), ...cells));
      return cells;
    });
    addRow('All frames, mean', before.meanMm, after.meanMm);
    addRow('All frames, largest', before.maxMm, after.maxMm);
  }

  // while the motion plays, ten times a second are enough
  #follow() {
    if (!this.cells || byId('numbers').offsetParent === null) return;
    const now = performance.now();
    clearTimeout(this.later);
    if (now - this.refreshed < refreshEvery) {
      this.later = setTimeout(() => this.#follow(), refreshEvery);
      return;
    }
    this.refreshed = now;
    ['skin', 'neural'].forEach((shape, column) => {
      const found = this.#ofThisFrame(shape);
      say(this.cells[0][column], digits(found?.mean));
      say(this.cells[1][column], digits(found?.max));
    });
  }

  // what quarn has measured where that is what is shown: the page's own target is packed
  #ofThisFrame(shape) {
    const { core, frame, envelope, hasErrors, manifest } = this.view;
    if (!hasErrors) return null;
    const measured = manifest.frameErrors?.[shape === 'skin' ? 'before' : 'after'][frame];
    return measured && envelope === 1 ? measured : meanAndMax(core.errors(shape));
  }
}

function addRow(name, before, after) {
  byId('number-rows').append(make('tr', {}, make('th', { text: name, scope: 'row' }), make('td', { text: digits(before) }),
    make('td', { text: digits(after) })));
}

const bases = { f32: 'single precision', i16: '16 bits', i8: '8 bits, a preview' };

/** What the model and the page are. */
export function showFacts({ manifest, core, timings, stage, view }) {
  const { model = {}, blocks } = manifest;
  const bytes = blocks.reduce((sum, block) => sum + block.bytes, 0);
  const facts = [
    ['Mesh', manifest.mesh],
    ['Scene', manifest.scene],
    ['Model', model.name],
    ['Trainer', model.trainer],
    ['Seed', model.seed],
    ['Deltas', model.deltaMode],
    ['Smoothing', model.smoothingIterations === undefined ? undefined : `${model.smoothingIterations} times`],
    ['Vertices', model.vertices === core.count.vertices ? model.vertices : `${model.vertices ?? '—'} of ${core.count.vertices}`],
    ['Shapes', model.shapes || 'none'],
    ['Network', model.networkBytes ? `${model.controls} controls, ${size(model.networkBytes)}` : `${model.controls} controls`],
    ['Basis', manifest.basis ? `${bases[manifest.basis] ?? manifest.basis}, ${mm(manifest.basisErrorMm)} at most` : undefined],
    ['Target', manifest.target === 'points' && manifest.targetErrorMm ? `stored within ${mm(manifest.targetErrorMm)}` : undefined],
    ['Input', manifest.whyPoints],
    ['Poses by controls', manifest.slidersDifferenceMm ? `within ${mm(manifest.slidersDifferenceMm)} of quarn` : undefined],
    ['Diagonal', manifest.diagonalMm ? mm(manifest.diagonalMm) : undefined],
    ['Data', size(bytes)],
    ['A frame', `${digits(view.frameMs)} ms to compute, here`],
    ['First picture', `after ${Math.round(timings.navigationToFirstFrameMs)} ms`],
    ['Drawn by', stage.name === 'raster' ? 'the processor (no WebGL 2)' : 'WebGL 2'],
    ['quarn', manifest.quarn],
  ];
  for (const [name, value] of facts)
    if (value !== undefined && value !== null && value !== '')
      byId('fact-list').append(make('dt', { text: name }), make('dd', { text: String(value) }));
}
