// SPDX-License-Identifier: Apache-2.0
// The modules of the page that need no browser, and what a browser with a decoder of its own never runs.
import assert from 'node:assert/strict';
import { decodedSize, decodePlainly } from '../../../../clients/viewer/page/base64.js';
import { Clock } from '../../../../clients/viewer/page/Clock.js';
import { edgesOf } from '../../../../clients/viewer/page/edges.js';
import { digits, percent } from '../../../../clients/viewer/page/format.js';

const decoded = (text) => {
  const bytes = new Uint8Array(decodedSize(text));
  decodePlainly(text, bytes);
  return bytes;
};

// any bytes, of all lengths of the last group, with every value among them
for (const length of [0, 1, 2, 3, 4, 5, 255, 256, 257]) {
  const bytes = Uint8Array.from({ length }, (_, i) => (i * 89 + length) & 255);
  assert.deepEqual(decoded(Buffer.from(bytes).toString('base64')), bytes, `${length} bytes`);
}
for (const text of ['AA%A', 'AAA\u00e9', 'AA=A', 'A===', '=AAA', 'AAAA====', 'AA-_', 'AAA ', 'AB\u0100A'])
  assert.throws(() => decoded(text), new Error('no base64'), text);

// it goes round, or ends with the last frame and begins anew; a frame begins when its time has come, not later
for (const [isLooping, from, seconds, frame, isRunning] of [
  [true, 0, 0, 0, true], [true, 0, 1 / 24, 1, true], [true, 0, 1 / 24 - 0.001, 0, true], [true, 3, 2 / 24, 0, true],
  [true, 4, 1 / 24, 1, true], [true, 2, 11 / 24, 3, true], [false, 1, 2 / 24, 3, true], [false, 1, 3 / 24, 4, false],
  [false, 0, 100, 4, false], [false, 4, 0, 0, true], [false, 2, -1, 0, true], [true, 2, -3 / 24, 4, true],
]) {
  const clock = new Clock(5, 24);
  clock.isLooping = isLooping;
  clock.run(from, 7000);
  assert.deepEqual([clock.frameAt(7000 + 1000 * seconds), clock.isRunning], [frame, isRunning], `${isLooping} ${from} ${seconds}`);
}

// a triangle and a quad that share an edge, in both directions
assert.deepEqual(edgesOf([3, 4], [0, 1, 2, 2, 1, 4, 3], 5), Uint32Array.of(0, 1, 1, 2, 2, 0, 1, 4, 4, 3, 3, 2));

for (const [value, text] of [[0, '0'], [128.4, '128'], [1000, '1000'], [100, '100'], [1.5, '1.5'], [0.03125, '0.0313'],
  [0.000248, '0.000248'], [9.999, '10'], [1e-4, '0.0001'], [1e-5, '1.0e-5'], [2.5e-9, '2.5e-9'], [-0.5, '-0.5'], [NaN, '—'], [undefined, '—']])
  assert.equal(digits(value), text);
for (const [part, text] of [[0, '0 %'], [0.934, '93 %'], [0.99, '99 %'], [0.9976, '99.7 %'], [0.99999, '99.9 %'], [1, '100 %'], [1.2, '120 %']])
  assert.equal(percent(part), text);
