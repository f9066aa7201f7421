# SPDX-License-Identifier: Apache-2.0
"""The sessions of wholeWay.sh: blender -b --factory-startup --python wholeWay.py -- sample|train|use FOLDER QUARN."""

import subprocess
import sys
import time
from pathlib import Path
from typing import Any, Tuple

import bpy
import numpy as np

HERE = Path(__file__).resolve().parent
sys.path[:0] = [str(HERE), str(HERE.parents[2] / "clients" / "blender")]

import neuralwarp_blender  # noqa: E402
from neuralwarp_blender import jobs, live, run_folder, stack  # noqa: E402
from rebuilt_arm import rebuild_arm  # noqa: E402

FRAMES = 96
WANTED = 1 / 16, 1 / 4  # of the plain armature's mean and largest error, as of the demo's hand (decision 0089)
SAME = 1e-5  # of the diagonal: what single precision makes of a pose that goes through other numbers


def say(text: str) -> None:
    print(f"wholeWay: {text}", flush=True)


def arm() -> Any:
    thing = bpy.data.objects["arm"]
    bpy.context.view_layer.objects.active = thing
    return thing


def fails(work: Any, wanted: str) -> None:
    try:
        work()
    except RuntimeError as error:
        assert wanted in str(error), error
        return
    raise AssertionError(f"no \"{wanted}\"")


def sample(folder: Path) -> None:
    bpy.ops.wm.read_factory_settings(use_empty=True)
    rebuild_arm()
    thing = arm()
    fails(bpy.ops.neuralwarp.sample, "the file was never saved")
    settings = thing.neuralwarp_sampling
    settings.samples, settings.motion, settings.activation_rate = 300, "motion", 0.8
    settings.epochs, settings.with_report = 16, False
    bpy.ops.wm.save_as_mainfile(filepath=str(folder / "arm.blend"))
    fails(bpy.ops.neuralwarp.train, "sample first")
    bpy.ops.neuralwarp.sample()
    fails(bpy.ops.neuralwarp.publish, "it was not trained")
    bpy.ops.neuralwarp.train()
    fails(bpy.ops.neuralwarp.train, "runs already")
    fails(bpy.ops.neuralwarp.sample, "the training of arm runs: cancel it")
    bpy.ops.wm.save_mainfile()
    say(f"sampled; {jobs.status(run_folder.folder_of(thing)).said}")


def train(folder: Path) -> None:
    """The session before has ended, and its training goes on; it is ended in the middle, and goes on once more."""
    bpy.ops.wm.open_mainfile(filepath=str(folder / "arm.blend"))
    of_arm = run_folder.folder_of(arm())
    now = jobs.status(of_arm)
    assert now.state == "runs", now
    while not (of_arm.run / "log" / "train.log").is_file() and jobs.status(of_arm).state == "runs":
        time.sleep(0.1)
    bpy.ops.neuralwarp.cancel()
    now = jobs.status(of_arm)
    assert now.state == "cancelled", now
    fails(bpy.ops.neuralwarp.cancel, "no training of arm runs")
    samples = of_arm.targets.read_bytes()
    of_arm.targets.write_bytes(samples[:1000])
    fails(lambda: bpy.ops.neuralwarp.train(wait=True), "targets.npy")
    of_arm.targets.write_bytes(samples)
    bpy.ops.neuralwarp.train(wait=True)
    assert (folder / "arm.nwrp" / "rig" / "scene.json").is_file() and arm().neuralwarp.model == "//arm.nwrp"
    bpy.ops.wm.save_mainfile()
    say(f"trained: {sorted(path.name for path in folder.iterdir())}")


def shown(thing: Any, what: str) -> np.ndarray:
    thing.neuralwarp.show = what
    bpy.context.view_layer.update()
    return stack.evaluated_points(thing)


def errors(points: np.ndarray, targets: np.ndarray) -> Tuple[float, float]:
    lengths = np.linalg.norm(points.astype(float) - targets, axis=2)
    return float(lengths.mean()), float(lengths.max())


def use(folder: Path, quarn: str) -> None:
    bpy.ops.wm.open_mainfile(filepath=str(folder / "arm.blend"))
    thing = arm()
    of_arm = run_folder.folder_of(thing)
    skins, targets = np.load(of_arm.motion_skin), np.load(of_arm.motion_targets)
    of_arm.path.rename(folder / "elsewhere")  # the model stands for itself
    bpy.ops.neuralwarp.use()
    fails(bpy.ops.neuralwarp.sample, "arm uses a model: stop that first")
    model_of = live.state(thing)
    assert model_of is not None
    neural = np.empty_like(skins)
    module = sys.modules["neuralwarp"]
    rest = model_of.scene.points(model_of.scene.deformers()[0]["geometries"][0]["original"])
    own = module.Deformer(module.Model.load(str(folder / "arm.nwrp")), np.array(
        [triangle.vertices for triangle in thing.data.loop_triangles]), rest)
    for frame in range(FRAMES):
        bpy.context.scene.frame_set(frame + 1)
        neural[frame] = stack.evaluated_points(thing)
        assert live.problem(thing) == "", live.problem(thing)
        # what Blender shows is what the module computes, bit for bit
        assert np.array_equal(neural[frame], own.evaluate(skins[frame], model_of.controls)), f"frame {frame + 1}"
        if frame % 19 == 0:  # A/B: the stack as it was sampled
            assert np.array_equal(shown(thing, "ARMATURE"), skins[frame])
            assert np.array_equal(shown(thing, "ORIGINAL"), targets[frame])
            assert np.array_equal(shown(thing, "NEURAL"), neural[frame])
    (folder / "elsewhere").rename(of_arm.path)
    compare_with_play(of_arm, quarn, neural)
    compare_with_targets(neural, skins, targets)
    refuse_another_mesh(folder, thing)


def compare_with_play(of_arm: run_folder.RunFolder, quarn: str, neural: np.ndarray) -> None:
    played = of_arm.path / "played.npy"
    subprocess.run([quarn, "play", of_arm.run / "motion.arm.json", "--frames", f"1-{FRAMES}", "--order", "file", "-o",
                    played, "--quiet"], check=True, stdout=subprocess.DEVNULL)
    points = np.load(played)
    diagonal = float(np.linalg.norm(np.ptp(points[0], axis=0)))
    distance = float(np.linalg.norm(points - neural, axis=2).max()) / diagonal
    say(f"Blender is {distance:.1e} of the diagonal from quarn play, at most")
    assert distance < SAME, distance


def compare_with_targets(neural: np.ndarray, skins: np.ndarray, targets: np.ndarray) -> None:
    (mean, largest), (skin_mean, skin_largest) = errors(neural, targets), errors(skins, targets)
    say(f"left is 1/{skin_mean / mean:.1f} of the plain armature's mean error, 1/{skin_largest / largest:.1f} of its "
        "largest")
    assert mean < WANTED[0] * skin_mean and largest < WANTED[1] * skin_largest


def refuse_another_mesh(folder: Path, thing: Any) -> None:
    bpy.ops.neuralwarp.stop()
    published = (folder / "arm.nwrp" / "metadata.json").read_bytes()
    before = np.array([list(polygon.vertices) for polygon in thing.data.polygons])
    thing.data.flip_normals()
    assert not np.array_equal(before, [list(polygon.vertices) for polygon in thing.data.polygons])
    fails(bpy.ops.neuralwarp.publish, "the model was made of other polygons than arm has")
    fails(bpy.ops.neuralwarp.use, "polygons")
    assert (folder / "arm.nwrp" / "metadata.json").read_bytes() == published


def main(part: str, folder: str, quarn: str) -> None:
    neuralwarp_blender.register()
    if part == "use":
        use(Path(folder), quarn)
    else:
        {"sample": sample, "train": train}[part](Path(folder))


if __name__ == "__main__":
    main(*sys.argv[sys.argv.index("--") + 1:])
