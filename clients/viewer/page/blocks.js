// SPDX-License-Identifier: Apache-2.0
// The blocks of the page: read from the document, summed, handed to the core, and forgotten.
import { decode } from './base64.js';
import { Failure } from './Failure.js';

/** The manifest of the page's scene. Throws a Failure where there is none that can be read. */
export function readManifest() {
  const element = document.getElementById('manifest');
  if (!element) throw new Failure('This page holds no character: `quarn view SCENE -o FILE.html` writes one that does.');
  let manifest;
  try {
    manifest = JSON.parse(element.textContent);
  } catch (error) {
    throw new Failure(`The page is damaged: its manifest cannot be read (${error.message}).`);
  }
  if (manifest.format !== 'neuralWarp page' || manifest.version !== 1)
    throw new Failure(`This page is of "${manifest.format}" ${manifest.version}, not of "neuralWarp page" 1.`);
  return manifest;
}

/** Gives every block to the core. The answer: the names of those whose bytes are not what the manifest says. */
export function loadBlocks(core, manifest) {
  const damaged = [];
  for (const { name, sum } of manifest.blocks) {
    const element = elementOf(name);
    if (!element || core.addBlock(name, element.textContent) !== sum) damaged.push(name);
    if (!isKept(name)) element?.remove();
  }
  return damaged;
}

/** The bytes of a block that the page itself looks at, or null. They are forgotten in the document. */
export function takeBytes(name) {
  const element = elementOf(name);
  if (!element) return null;
  try {
    return decode(element.textContent);
  } catch {
    return null;
  } finally {
    element.remove();
  }
}

const elementOf = (name) => document.getElementById(`block-${name}`);

const isKept = (name) => ['frames.sliders', 'mesh.sizes', 'mesh.corners', 'draw.corners', 'draw.uvs'].includes(name) ||
  name.startsWith('texture.');
