// SPDX-License-Identifier: Apache-2.0
// How a surface looks: the lights of `quarn render` (quarn/render/lights.h), which stand with the camera, so that all views are lit
// alike; or the colours of distances, each pixel the colour of its own. The z-buffer of the core looks the same.
import { ShaderMaterial, Color, DoubleSide, Vector3 } from 'three';
import { heatStops } from './heat.js';

export const clay = new Color().setRGB(0.68, 0.435, 0.32); // linear, as the colours of materials are
export const clayNumber = 0xd7af99; // the same, sRGB

const vertexShader = `
attribute float distanceToTarget;
varying vec3 toSurface, turned;
varying float far;
varying vec2 at;
void main() {
  vec4 place = modelViewMatrix * vec4(position, 1.0);
  toSurface = place.xyz;
  turned = normalMatrix * normal;
  far = distanceToTarget;
  at = uv;
  gl_Position = projectionMatrix * place;
}`;

const fragmentShader = `
uniform vec3 albedo, stops[5];
uniform sampler2D picture;
uniform bool hasPicture, isCutOut, isHeat;
uniform float range;
varying vec3 toSurface, turned;
varying float far;
varying vec2 at;

vec3 heatColour(float part) {
  float step = clamp(part, 0.0, 1.0) * 4.0;
  vec3 colour = mix(stops[0], stops[1], clamp(step, 0.0, 1.0));
  colour = mix(colour, stops[2], clamp(step - 1.0, 0.0, 1.0));
  colour = mix(colour, stops[3], clamp(step - 2.0, 0.0, 1.0));
  return mix(colour, stops[4], clamp(step - 3.0, 0.0, 1.0));
}

vec3 shoulder(vec3 value) {
  return mix(value, 0.6 + 0.4 * (1.0 - exp(-(value - 0.6) / 0.4)), step(0.6, value));
}

vec3 encoded(vec3 linear) {
  return mix(12.92 * linear, 1.055 * pow(linear, vec3(1.0 / 2.4)) - 0.055, step(0.0031308, linear));
}

void main() {
  vec3 toViewer = normalize(-toSurface);
  vec3 n = normalize(turned);
  if (dot(n, toViewer) < 0.0 && !gl_FrontFacing) n = -n;
  if (isHeat) {
    gl_FragColor = vec4(heatColour(far / range) * (0.8 + 0.2 * max(n.z, 0.0)), 1.0);
    return;
  }
  vec4 own = hasPicture ? texture2D(picture, at) : vec4(1.0);
  if (isCutOut && own.a < 0.5) discard;
  const vec3 key = vec3(2.25, 2.10, 1.90);
  vec3 toKey = normalize(vec3(-0.50, 0.62, 0.75));
  vec3 sky = mix(vec3(0.46, 0.40, 0.37), vec3(0.98, 1.04, 1.14), 0.5 + 0.5 * n.y);
  float edge = 1.0 - clamp(n.z, 0.0, 1.0);
  vec3 light = own.rgb * albedo * 0.5 * (key * max(0.0, dot(n, toKey)) + sky)
    + vec3(0.16, 0.17, 0.19) * edge * edge * edge * edge
    + 0.05 * key * pow(max(0.0, dot(n, normalize(toKey + toViewer))), 24.0);
  gl_FragColor = vec4(encoded(shoulder(light)), 1.0);
}`;

/** A material of its own values; all share one program. */
export function surfaceMaterial({ colour = clay, picture = null, isCutOut = false } = {}) {
  return new ShaderMaterial({
    vertexShader,
    fragmentShader,
    side: DoubleSide,
    polygonOffset: true, // edges lie in front
    polygonOffsetFactor: 1,
    polygonOffsetUnits: 1,
    uniforms: {
      albedo: { value: colour },
      stops: { value: heatStops.map((stop) => new Vector3(...stop)) },
      picture: { value: picture },
      hasPicture: { value: picture !== null },
      isCutOut: { value: isCutOut },
      isHeat: { value: false },
      range: { value: 1 },
    },
  });
}
