// SPDX-License-Identifier: Apache-2.0
// How numbers are written.

/** At most three digits that count, without an exponent down to a ten-thousandth: "0.0312", "1.2", "128". */
export function digits(value) {
  if (!Number.isFinite(value)) return '—';
  if (value === 0) return '0';
  const before = Math.floor(Math.log10(Math.abs(value))) + 1;
  if (before < -3) return value.toExponential(1);
  const text = value.toFixed(Math.max(0, 3 - before));
  return text.includes('.') ? text.replace(/\.?0+$/, '') : text;
}

export const mm = (value) => `${digits(value)} mm`;

/** "93 %"; 100 % is all of it, and nothing less: "99.7 %". */
export function percent(part) {
  const value = 100 * part;
  return value > 99 && value < 100 ? `${(Math.floor(10 * value) / 10).toFixed(1)} %` : `${Math.round(value)} %`;
}

/** "1.8 MB" of bytes, in thousands. */
export function size(bytes) {
  if (bytes < 1000) return `${bytes} bytes`;
  if (bytes < 1e6) return `${Math.round(bytes / 1000)} kB`;
  return `${(bytes / 1e6).toFixed(1)} MB`;
}

/** Mean and largest of an array that may be absent. */
export function meanAndMax(values) {
  if (!values?.length) return null;
  let sum = 0;
  let max = 0;
  for (let i = 0; i < values.length; ++i) {
    sum += values[i];
    if (values[i] > max) max = values[i];
  }
  return { mean: sum / values.length, max };
}
