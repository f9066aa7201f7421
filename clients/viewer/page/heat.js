// SPDX-License-Identifier: Apache-2.0
// The colours of a distance, the same as in the pictures of `quarn render`: light grey over yellow to red, sRGB, at 0,
// 1/4 ... 1 of the range.
export const heatStops = [
  [0.87, 0.87, 0.87],
  [0.96, 0.79, 0.38],
  [0.97, 0.63, 0.14],
  [0.9, 0.36, 0.1],
  [0.7, 0.04, 0.09],
];

/** The scale from left to right, for a style sheet. */
export function heatGradient() {
  const colours = heatStops.map((stop) => `rgb(${stop.map((part) => Math.round(255 * part)).join(' ')})`);
  return `linear-gradient(to right, ${colours.join(', ')})`;
}
