// SPDX-License-Identifier: Apache-2.0
// The page proves itself: every block has the sum that the manifest says, and the stored frames, computed anew, have the
// bits that quarn's own build of the core found.
import { mm } from './format.js';

/** Checks the stored frames; `damagedBlocks` are known. The core shows another frame afterwards. */
export function verdictOf(core, manifest, damagedBlocks) {
  const checks = [];
  for (let i = 0; i < core.count.checks; ++i) checks.push(core.check(i));
  const same = damagedBlocks.length === 0 && checks.length > 0 && checks.every(Boolean);
  const native = nativeSentence(checks, damagedBlocks, manifest.blocks.length);
  const deformer = deformerSentence(manifest);
  return { same, checks, damagedBlocks, native, deformer, text: `${native} ${deformer}`.trim() };
}

/** For a page whose core cannot open what is there. */
export function noVerdict(damagedBlocks, reason) {
  const text = damagedBlocks.length ? `This page is damaged: ${damage(damagedBlocks)} The core says: ${reason}`
    : `This page cannot be shown: ${reason}`;
  return { same: false, checks: [], damagedBlocks, native: text, deformer: '', text };
}

function nativeSentence(checks, damagedBlocks, blocks) {
  const wrong = checks.filter((isSame) => !isSame).length;
  if (damagedBlocks.length) {
    const points = wrong ? ` ${wrong} of ${checks.length} stored frames come out differently.` : '';
    return `Not the same as native: ${damage(damagedBlocks)}${points}`;
  }
  if (wrong) return `Not the same as native: ${wrong} of ${checks.length} stored frames come out differently in this browser.`;
  if (!checks.length) return 'Not compared with native: the page stores no frames to compare.';
  return `Same as native: ${checks.length} stored frames come out bit for bit as in quarn, and all ${blocks} blocks are whole.`;
}

function deformerSentence({ difference, frames }) {
  if (!difference) return '';
  const where = difference.largestMm > 0 && frames?.[difference.frame] !== undefined ? ` (frame ${frames[difference.frame]})` : '';
  return `Same as the deformer: at export, no point was farther than ${mm(difference.largestMm)} from quarn play${where}; ` +
    `the limit is ${mm(difference.limitMm)}.`;
}

function damage(names) {
  return names.length === 1 ? `the block ${names[0]} is damaged.` : `the blocks ${names.join(', ')} are damaged.`;
}
