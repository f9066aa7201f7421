// SPDX-License-Identifier: Apache-2.0
// Where the character is seen from, with or without WebGL: a camera that orbits by mouse, touch or keys.
import { PerspectiveCamera, Sphere, Vector3 } from 'three';
import { OrbitControls } from 'three/addons/controls/OrbitControls.js';

// to the right, to the top and to the viewer of the front, for each axis that can point up, as `quarn render` has them
const fronts = {
  y: [new Vector3(1, 0, 0), new Vector3(0, 1, 0), new Vector3(0, 0, 1)],
  z: [new Vector3(1, 0, 0), new Vector3(0, 0, 1), new Vector3(0, -1, 0)],
  x: [new Vector3(0, -1, 0), new Vector3(1, 0, 0), new Vector3(0, 0, 1)],
};
const margin = 1.06;
const steepest = 89.9; // degrees: above the pole there is no up

export class Camera {
  /** `element` is dragged on; `view` has azimuth and elevation in degrees, and up. */
  constructor(element, view) {
    const [right, up, viewer] = fronts[view?.up] ?? fronts.y;
    const azimuth = radians(view?.azimuth ?? 30);
    const elevation = radians(Math.max(-steepest, Math.min(steepest, view?.elevation ?? 15)));
    this.direction = new Vector3().addScaledVector(viewer, Math.cos(azimuth) * Math.cos(elevation))
      .addScaledVector(right, Math.sin(azimuth) * Math.cos(elevation)).addScaledVector(up, Math.sin(elevation));
    this.three = new PerspectiveCamera(30, 1, 0.1, 10);
    this.three.up.copy(up);
    this.orbit = new OrbitControls(this.three, element);
    this.orbit.zoomToCursor = true;
    this.sphere = new Sphere(new Vector3(), 1);
  }

  /** Goes as near as `points`, [3n], can be seen whole; the direction is kept. */
  fit(points) {
    const { center } = measure(points, this.sphere);
    if (this.isPlaced) this.direction.subVectors(this.three.position, this.orbit.target).normalize();
    this.isPlaced = true;
    this.orbit.target.copy(center);
    this.three.position.copy(center).addScaledVector(this.direction, this.#distanceTo(points) * margin);
    this.orbit.minDistance = 0.05 * this.sphere.radius;
    this.orbit.maxDistance = 40 * this.sphere.radius;
    this.orbit.update();
  }

  setAspect(aspect) {
    this.three.aspect = aspect;
  }

  /** To be called before a picture: depths that hold the sphere, wherever the camera stands. */
  update() {
    const away = this.three.position.distanceTo(this.sphere.center);
    this.three.near = Math.max(away - 3 * this.sphere.radius, 0.01 * this.sphere.radius);
    this.three.far = away + 30 * this.sphere.radius;
    this.three.updateProjectionMatrix();
    this.three.updateMatrixWorld();
  }

  /** Turns by angles in degrees, as a drag does. */
  turn(right, up) {
    this.orbit.rotateLeft(radians(-right));
    this.orbit.rotateUp(radians(-up));
    this.orbit.update();
  }

  // how far from the middle a viewer must be, whose picture the points fit into
  #distanceTo(points) {
    const right = new Vector3().crossVectors(this.three.up, this.direction).normalize();
    const up = new Vector3().crossVectors(this.direction, right);
    const upright = Math.tan(radians(this.three.fov / 2));
    const across = upright * this.three.aspect;
    const point = new Vector3();
    let distance = 0;
    for (let i = 0; i < points.length; i += 3) {
      point.fromArray(points, i).sub(this.sphere.center);
      const aside = Math.max(Math.abs(point.dot(right)) / across, Math.abs(point.dot(up)) / upright);
      distance = Math.max(distance, point.dot(this.direction) + aside);
    }
    return distance || 1;
  }
}

const radians = (degrees) => (degrees * Math.PI) / 180;

// the middle of the points' box, and how far the box reaches from it
function measure(points, sphere) {
  const [least, most] = boxOf(points);
  sphere.center.addVectors(least, most).multiplyScalar(0.5);
  sphere.radius = sphere.center.distanceTo(most) || 1;
  return sphere;
}

/** Least and most of the coordinates of points, [3n]. */
export function boxOf(points) {
  const least = new Vector3(Infinity, Infinity, Infinity);
  const most = new Vector3(-Infinity, -Infinity, -Infinity);
  const point = new Vector3();
  for (let i = 0; i < points.length; i += 3) {
    point.fromArray(points, i);
    least.min(point);
    most.max(point);
  }
  return [least, most];
}

/** The eight corners of a box, [24]. */
export function cornersOf(least, most) {
  const corners = [];
  for (const x of [least.x, most.x]) for (const y of [least.y, most.y]) for (const z of [least.z, most.z]) corners.push(x, y, z);
  return corners;
}
