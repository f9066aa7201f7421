// SPDX-License-Identifier: Apache-2.0
// What each key does, and the sheet that says so.
import { byId, make } from './elements.js';
import { modes } from './View.js';

/** Listens, and fills the sheet of keys. */
export function listenToKeys({ view, timeLine, tools, sliders, camera, fit, switchTheme, showWorst }) {
  const turn = 15; // degrees
  const keys = [
    [' ', 'Space', 'play or pause', () => timeLine.toggle()],
    ['ArrowLeft', '←', 'frame before', () => timeLine.step(-1)],
    ['ArrowRight', '→', 'next frame', () => timeLine.step(1)],
    ['Home', 'Home', 'first frame', () => timeLine.goTo(0)],
    ['End', 'End', 'last frame', () => timeLine.goTo(timeLine.frames - 1)],
    ['l', 'L', 'loop', () => timeLine.toggleLoop()],
    ['p', 'P', 'worst frame of the network', () => showWorst('after')],
    ...modes.map((mode, i) => [String(i + 1), String(i + 1), mode, () => tools.choose(mode)]),
    ['f', 'F', 'flip between two shapes', () => tools.choose('flip')],
    ['h', 'H', 'heat map: off, before, after', () => tools.nextHeat()],
    ['w', 'W', 'edges of the polygons', () => tools.toggle('hasEdges')],
    ['t', 'T', 'textures', () => tools.toggle('hasTextures')],
    ['a', 'A', 'fit the character into the picture', fit],
    ['j', 'J', 'turn to the left', () => camera.turn(-turn, 0)],
    ['k', 'K', 'turn to the right', () => camera.turn(turn, 0)],
    ['i', 'I', 'turn up', () => camera.turn(0, turn)],
    ['m', 'M', 'turn down', () => camera.turn(0, -turn)],
    ['r', 'R', "back to the motion's own pose", () => sliders.reset()],
    ['/', '/', 'search the controls', () => byId('search').focus()],
    ['d', 'D', 'light or dark', switchTheme],
    ['?', '?', 'this sheet', () => byId('sheet').showModal()],
  ];
  const actions = new Map(keys.map(([key, , , action]) => [key, action]));
  const lines = keys.map(([, name, meaning]) => [name, meaning]);
  lines.splice(12, 0, ['X', 'held: the other shape of the pair']);
  for (const [name, meaning] of lines)
    byId('key-list').append(make('dt', {}, make('kbd', { text: name })), make('dd', { text: meaning }));

  addEventListener('keydown', (event) => {
    if (event.ctrlKey || event.metaKey || event.altKey || isBusy(event)) return;
    const key = event.key.length === 1 ? event.key.toLowerCase() : event.key;
    const action = actions.get(key);
    if (key === 'x') view.peek(true);
    else if (!action) return;
    else action();
    event.preventDefault();
  });
  addEventListener('keyup', (event) => {
    if (event.key.toLowerCase() === 'x') view.peek(false);
  });
  addEventListener('blur', () => view.peek(false));
}

// keys that belong to what has the focus: texts take all of them, sliders the arrows, buttons the space bar
function isBusy({ key, target }) {
  if (byId('sheet').open) return true;
  if (target.matches?.('input[type=search], select')) return true;
  if (target.matches?.('input[type=range]')) return key.startsWith('Arrow') || key === 'Home' || key === 'End';
  return key === ' ' && (target.matches?.('button, summary') ?? false);
}
