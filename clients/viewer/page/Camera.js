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
const steepest = 89.9; // degrees: above the pole there is no up

export class Camera {
  /** `element` is dragged on; `view` has azimuth and elevation in degrees, and up. `onTurn` is called after each change. */
  constructor(element, view, onTurn) {
    const [right, up, viewer] = fronts[view?.up] ?? fronts.y;
    const azimuth = radians(view?.azimuth ?? 30);
    const elevation = radians(Math.max(-steepest, Math.min(steepest, view?.elevation ?? 15)));
    this.direction = new Vector3().addScaledVector(viewer, Math.cos(azimuth) * Math.cos(elevation))
      .addScaledVector(right, Math.sin(azimuth) * Math.cos(elevation)).addScaledVector(up, Math.sin(elevation));
    this.three = new PerspectiveCamera(30, 1, 0.1, 10);
    this.three.up.copy(up);
    this.orbit = new OrbitControls(this.three, element);
    this.orbit.zoomToCursor = true;
    this.orbit.addEventListener('change', onTurn);
    this.sphere = new Sphere(new Vector3(), 1);
  }

  /** Turns to a sphere around `points`, [3n]; the direction is kept but for the first time. */
  fit(points) {
    sphereAround(points, this.sphere);
    const { center, radius } = this.sphere;
    const direction = this.isPlaced ? this.three.position.clone().sub(this.orbit.target).normalize() : this.direction;
    this.isPlaced = true;
    this.orbit.target.copy(center);
    this.three.position.copy(center).addScaledVector(direction, radius / Math.sin(this.#narrowHalfAngle()) * 1.02);
    this.orbit.minDistance = 0.05 * radius;
    this.orbit.maxDistance = 40 * radius;
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

  #narrowHalfAngle() {
    const upright = radians(this.three.fov / 2);
    return this.three.aspect >= 1 ? upright : Math.atan(Math.tan(upright) * this.three.aspect);
  }
}

const radians = (degrees) => (degrees * Math.PI) / 180;

function sphereAround(points, sphere) {
  const least = new Vector3(Infinity, Infinity, Infinity);
  const most = new Vector3(-Infinity, -Infinity, -Infinity);
  const point = new Vector3();
  for (let i = 0; i < points.length; i += 3) {
    point.fromArray(points, i);
    least.min(point);
    most.max(point);
  }
  sphere.center.addVectors(least, most).multiplyScalar(0.5);
  let farthest = 0;
  for (let i = 0; i < points.length; i += 3)
    farthest = Math.max(farthest, point.fromArray(points, i).distanceToSquared(sphere.center));
  sphere.radius = Math.sqrt(farthest) || 1;
}
