// SPDX-License-Identifier: Apache-2.0
// Base64 of the page's blocks, decoded where the bytes are needed: the browser's own decoder where there is one.

const digits = 'ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/';
const valueOf = new Uint8Array(128).fill(255);
for (let i = 0; i < digits.length; ++i) valueOf[digits.charCodeAt(i)] = i;

/** The number of bytes that `text` stands for: standard base64 with its padding and nothing else. */
export function decodedSize(text) {
  const padding = text.endsWith('==') ? 2 : text.endsWith('=') ? 1 : 0;
  return (text.length / 4) * 3 - padding;
}

/** Writes the bytes of `text` to `target`, a Uint8Array of just that size. Throws for anything that is no base64. */
export function decodeInto(text, target) {
  if (text.length % 4 !== 0 || decodedSize(text) !== target.length) throw new Error('no base64 of that size');
  if (target.setFromBase64) {
    const { written } = target.setFromBase64(text, { lastChunkHandling: 'strict' });
    if (written !== target.length) throw new Error('no base64 of that size');
  } else {
    decodePlainly(text, target);
  }
}

/** decodeInto for browsers without a decoder of their own. */
export function decodePlainly(text, target) {
  let bits = 0;
  let seen = 0; // all values: 255 among them sets the highest bits
  for (let from = 0, to = 0; to < target.length; from += 4) {
    for (let i = 0; i < 4; ++i) {
      const isPadding = to + i > target.length; // as decodedSize has counted it
      const code = text.charCodeAt(from + i);
      const value = isPadding ? 0 : code < 128 ? valueOf[code] : 255;
      seen |= value;
      bits = (bits << 6) | value;
    }
    for (let shift = 16; shift >= 0 && to < target.length; shift -= 8) target[to++] = bits >> shift;
  }
  if (seen > 63) throw new Error('no base64');
}

/** The bytes of `text`. */
export function decode(text) {
  const target = new Uint8Array(decodedSize(text));
  decodeInto(text, target);
  return target;
}
