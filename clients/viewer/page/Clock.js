// SPDX-License-Identifier: Apache-2.0
// Which frame it is: time that runs by the seconds, whatever a frame takes to draw.

export class Clock {
  isLooping = true;
  #start = null; // time of the first frame, in milliseconds

  constructor(frames, framesPerSecond) {
    this.frames = frames;
    this.framesPerSecond = framesPerSecond > 0 ? framesPerSecond : 24;
  }

  get isRunning() {
    return this.#start !== null;
  }

  /** From `frame` on, now; from the first where it is the last. */
  run(frame, now) {
    const from = frame >= this.frames - 1 ? 0 : frame;
    this.#start = now - (from * 1000) / this.framesPerSecond;
  }

  stop() {
    this.#start = null;
  }

  /** The frame at a time. Without loop, it stops at the last. */
  frameAt(now) {
    const passed = Math.floor(((now - this.#start) * this.framesPerSecond) / 1000 + 1e-6);
    if (this.isLooping) return ((passed % this.frames) + this.frames) % this.frames;
    if (passed < this.frames - 1) return Math.max(0, passed);
    this.stop();
    return this.frames - 1;
  }
}
