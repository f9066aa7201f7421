// SPDX-License-Identifier: Apache-2.0
// What the page offers to whoever drives it from outside, a test for example: window.neuralWarp.

/** Fills `page`, which has `ready` and `timings` already. */
export function offer(page, { manifest, core, view, stage, sliders, timeLine }) {
  Object.assign(page, {
    manifest,
    renderer: stage.name,
    showFrame: (frame) => timeLine.goTo(frame),
    setSlider: (name, value) => {
      if (!sliders.set(name, value)) throw new Error(`no slider "${name}", or no number: ${value}`);
    },
    points: (shape) => {
      view.compute();
      return core.points(shape)?.slice() ?? null;
    },
    setMode: (mode) => view.setMode(mode),
    setHeat: (heat) => view.setHeat(heat),
    setSplit: (part) => view.setSplit(part),
    setTextures: (isOn) => view.set({ hasTextures: Boolean(isOn) }),
    setEnvelope: (factor) => view.setEnvelope(factor),
    draw: () => view.draw(),
    memory: () => ({ wasmBytes: core.memory.buffer.byteLength, ...stage.memory }),
  });
  Object.defineProperties(page, {
    frame: { get: () => view.frame },
    sliders: { get: () => sliders.all.map(({ name }, i) => ({ name, value: sliders.values[i] })) },
  });
}
