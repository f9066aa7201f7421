// SPDX-License-Identifier: Apache-2.0
// The page: reads what `quarn view` wrote into it, draws the first frame, then proves itself.
import { Vector3 } from 'three';
import { offer } from './api.js';
import { loadBlocks, readManifest, takeBytes } from './blocks.js';
import { boxOf, Camera, cornersOf } from './Camera.js';
import { Core } from './Core.js';
import { edgesOf } from './edges.js';
import { byId, make, say } from './elements.js';
import { Failure } from './Failure.js';
import { listenToKeys } from './keys.js';
import { Legend, Pin } from './Legend.js';
import { Numbers, showFacts } from './Numbers.js';
import { texturesOf } from './pictures.js';
import { noVerdict, verdictOf } from './proof.js';
import { Raster } from './Raster.js';
import { Sliders } from './Sliders.js';
import { Stage } from './Stage.js';
import { followTheme } from './theme.js';
import { TimeLine } from './TimeLine.js';
import { Tools } from './Tools.js';
import { View } from './View.js';

const page = { timings: {} };
window.neuralWarp = page;
const switchTheme = followTheme();
page.ready = start().catch(fail);

async function start() {
  const manifest = readManifest();
  page.manifest = manifest;
  showTitle(manifest);
  const core = await Core.start(byId('core').textContent);
  byId('core').remove();
  const damaged = loadBlocks(core, manifest);
  openCore(core, damaged);

  const { view, camera, stage } = makePicture(core, manifest);
  view.draw();
  stage.finish();
  page.timings.navigationToFirstFrameMs = performance.now();

  const parts = { manifest, core, view, camera, stage, timings: page.timings };
  makePanels(parts);
  view.tell();
  await shown();
  prove(parts, damaged);
  await addTextures(stage, manifest, view);
}

function openCore(core, damaged) {
  try {
    core.open();
  } catch (error) {
    if (!(error instanceof Failure)) throw error;
    page.verdict = noVerdict(damaged, error.message);
    throw new Failure(page.verdict.text);
  }
}

function makePicture(core, manifest) {
  byId('time').hidden = core.count.frames < 1; // these have their heights before the picture has its own
  byId('track').toggleAttribute('data-plain', !manifest.frameErrors);
  const camera = new Camera(byId('canvas'), manifest.view);
  const stage = makeStage(core, camera);
  const view = new View(core, manifest, stage);
  view.onFailure.push(tellLater);
  byId('canvas').append(stage.element);
  followSize(stage, () => view.draw());
  camera.fit(reachOf(core));
  camera.orbit.addEventListener('change', () => view.ask());
  return { view, camera, stage };
}

// gives the stage its size, and again whenever it changes
function followSize(stage, onChange) {
  let [width, height] = [0, 0];
  const isNew = () => {
    const { clientWidth, clientHeight } = byId('stage');
    if (clientWidth === width && clientHeight === height) return false;
    [width, height] = [clientWidth, clientHeight];
    stage.resize(Math.max(1, width), Math.max(1, height), Math.min(2, devicePixelRatio || 1));
    return true;
  };
  isNew();
  new ResizeObserver(() => {
    if (isNew()) onChange();
  }).observe(byId('stage'));
}

// the corners of a box around some frames of the motion
function reachOf(core) {
  const { frames } = core.count;
  const [least, most] = [new Vector3(Infinity, Infinity, Infinity), new Vector3(-Infinity, -Infinity, -Infinity)];
  for (let i = 0; i < 6; ++i) {
    core.showFrame(Math.round((i * (frames - 1)) / 5));
    const [from, to] = boxOf(core.points('neural'));
    least.min(from);
    most.max(to);
  }
  return cornersOf(least, most);
}

// the z-buffer of the core where there is no WebGL 2, or where it is asked for
function makeStage(core, camera) {
  return (location.hash === '#raster' ? null : Stage.make(core, camera)) ?? new Raster(core, camera);
}

function makePanels(parts) {
  const { manifest, core, view, camera, stage } = parts;
  const showWorst = (when) => goToWorst(parts, when);
  const timeLine = new TimeLine(view, showWorst);
  const tools = new Tools(view);
  const motion = takeBytes('frames.sliders');
  const sliders = new Sliders(view, motion && new Float64Array(motion.buffer), () => timeLine.stop());
  const fit = () => camera.fit(core.points(view.shapes[0]));
  Object.assign(parts, { timeLine, tools, sliders, switchTheme, fit, showWorst });
  new Numbers(view);
  new Legend(view);
  new Pin(view, camera);
  giveEdges(core, stage);
  listenToKeys(parts);
  byId('theme').addEventListener('click', switchTheme);
  byId('fit').addEventListener('click', fit);
  byId('help').addEventListener('click', () => byId('sheet').showModal());
  byId('seal').addEventListener('click', () => byId('proof').scrollIntoView());
  byId('textures').hidden = !(manifest.textures?.length && stage.name === 'webgl2');
  byId('edges').hidden = stage.name !== 'webgl2';
  say(byId('colophon'), `Written by quarn ${manifest.quarn}. Drawn with three.js, under the MIT licence, which is in the source of this page.`);
  offer(page, parts);
}

function goToWorst({ manifest, view, timeLine }, when) {
  if (!manifest.errors) return;
  const { worstFrame, worstVertex } = manifest.errors[when];
  timeLine.goTo(worstFrame);
  view.set({ pin: worstVertex ?? -1 });
  if (!view.isTwoSided) view.setMode(when === 'before' ? 'skin' : 'neural');
}

function giveEdges(core, stage) {
  const sizes = takeBytes('mesh.sizes');
  const meshCorners = takeBytes('mesh.corners');
  const corners = takeBytes('draw.corners') ?? meshCorners;
  if (sizes && corners)
    stage.setEdges(edgesOf(new Uint32Array(sizes.buffer), new Uint32Array(corners.buffer), core.count.drawVertices));
}

function prove({ core, manifest, view, stage, timings }, damaged) {
  page.verdict = verdictOf(core, manifest, damaged);
  view.forget(); // the picture is still that of the first frame
  view.compute();
  timings.toVerdictMs = performance.now();
  timings.frameMs = view.frameMs;
  showVerdict(page.verdict);
  showFacts({ manifest, core, timings, stage, view });
}

function showVerdict({ same, native, deformer, checks }) {
  const state = same ? 'good' : checks.length ? 'bad' : 'none';
  byId('seal').dataset.state = byId('same-native').dataset.state = state;
  say(byId('seal'), same ? '✓ Same as quarn' : state === 'bad' ? '✗ Not the same as quarn' : 'Not compared');
  say(byId('same-native'), native);
  byId('same-deformer').dataset.state = same ? 'good' : 'none';
  say(byId('same-deformer'), deformer);
}

async function addTextures(stage, manifest, view) {
  const textures = stage.name === 'webgl2' ? await texturesOf(manifest) : null;
  if (!textures) return;
  stage.setTextures(textures.uvs, textures.materials);
  view.draw();
}

function showTitle({ title, mesh, scene, frames }) {
  document.title = title || mesh || 'neuralWarp';
  say(byId('title'), title || mesh || '');
  say(byId('subtitle'), [mesh !== title ? mesh : '', scene, `${frames?.length ?? 0} frames`].filter(Boolean).join(' · '));
  say(byId('seal'), 'Checking…');
}

// after the picture is on the screen; a page in the background shows none, and does not wait
function shown() {
  return new Promise((resolve) => {
    setTimeout(resolve, 100);
    requestAnimationFrame(() => setTimeout(resolve));
  });
}

function sentenceOf(error) {
  return error instanceof Failure ? error.message : `Something went wrong in this page: ${error.message}`;
}

function fail(error) {
  console.error(error);
  const sentence = sentenceOf(error);
  page.verdict ??= { ...noVerdict([], ''), native: sentence, text: sentence };
  page.error = sentence;
  document.body.dataset.failed = '';
  byId('stage').append(make('p', { className: 'failure', text: sentence }));
  byId('seal').dataset.state = byId('same-native').dataset.state = 'bad';
  say(byId('seal'), 'Not shown');
  say(byId('same-native'), sentence);
}

function tellLater(error) {
  console.error(error);
  page.error = sentenceOf(error);
  byId('note').hidden = false;
  say(byId('note'), page.error);
}
