// SPDX-License-Identifier: Apache-2.0
// Textures of the page, made of its own bytes: nothing is loaded from an address.
import { Color, RepeatWrapping, SRGBColorSpace, Texture } from 'three';
import { takeBytes } from './blocks.js';
import { clay } from './surface.js';

/** What Stage.setTextures wants, or null where the page has no textures. */
export async function texturesOf(manifest) {
  if (!manifest.textures?.length || !manifest.materials?.length) return null;
  const uvBytes = takeBytes('draw.uvs');
  if (!uvBytes) return null;
  const pictures = await Promise.all(manifest.textures.map(pictureOf));
  const materials = manifest.materials.map((material) => ({
    ...material,
    picture: pictures[material.texture] ?? null,
    colour: material.colour ? new Color().setRGB(...material.colour) : pictures[material.texture] ? new Color(1, 1, 1) : clay,
  }));
  return { uvs: new Float32Array(uvBytes.buffer), materials };
}

// null for a picture that the browser cannot read: its part is drawn without
async function pictureOf({ block, mime }) {
  const bytes = takeBytes(block);
  if (!bytes) return null;
  try {
    const bitmap = await createImageBitmap(new Blob([bytes], { type: mime }),
      { imageOrientation: 'flipY', premultiplyAlpha: 'none', colorSpaceConversion: 'none' });
    const texture = new Texture(bitmap);
    texture.flipY = false;
    texture.colorSpace = SRGBColorSpace;
    texture.wrapS = texture.wrapT = RepeatWrapping;
    texture.anisotropy = 4;
    texture.needsUpdate = true;
    return texture;
  } catch {
    return null;
  }
}
