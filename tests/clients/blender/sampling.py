# SPDX-License-Identifier: Apache-2.0
"""Tests of sampling, without a window: blender -b --factory-startup --python sampling.py -- FOLDER QUARN."""

import os
import re
import subprocess
import sys
from math import radians
from pathlib import Path
from typing import Any, Callable, Dict, List, Tuple

import bpy
import numpy as np

HERE = Path(__file__).resolve().parent
sys.path[:0] = [str(HERE), str(HERE.parents[2] / "clients" / "blender")]

import random_rig  # noqa: E402
from neuralwarp_blender import jobs, limits, posing, run_folder, sampling, stack  # noqa: E402
from neuralwarp_blender.refused import Refused  # noqa: E402
from rebuilt_arm import JOINTS, make_armature, rebuild_arm  # noqa: E402

FOLDER, QUARN = (Path(word) for word in sys.argv[sys.argv.index("--") + 1:])
CLOSE = 2e-6  # of the mesh's size: single precision, along a chain of bones


def new_arm() -> Tuple[Any, Any]:
    bpy.ops.wm.read_factory_settings(use_empty=True)
    thing, armature = rebuild_arm()
    bpy.ops.wm.save_as_mainfile(filepath=str(FOLDER / "arm.blend"))
    return thing, armature


def refused(work: Callable[[], Any]) -> str:
    try:
        work()
    except Refused as error:
        return str(error)
    return "not refused"


def quarn(*words: object) -> None:
    subprocess.run([str(QUARN), *map(str, words), "--quiet"], check=True, stdout=subprocess.DEVNULL)


def difference(ours: Path, theirs: Path) -> float:
    ours_points, points = np.load(ours), np.load(theirs)
    assert ours_points.shape == points.shape and np.ptp(points, axis=0).max() > 0.1
    return float(np.abs(ours_points - points).max() / np.ptp(points))


def test_the_skin_is_quarns_and_targets_are_the_stacks() -> None:
    for seed in (1, 2, 3):
        thing, _, action = random_rig.make_rig(seed)
        bpy.ops.wm.save_as_mainfile(filepath=str(FOLDER / f"random{seed}.blend"))
        os.rename(FOLDER / f"random{seed}.blend", FOLDER / "random.blend")
        sampling.sample_all(thing, sampling.Settings(samples=12, motion=action.name, seed=seed), lambda *_: None)
        folder, name = run_folder.folder_of(thing), "_1_mesh___skin.outputGeom[0]"
        quarn("bake", folder.run / "poses.json", name, "--frames", "1-12", "--order", "file", "-o", FOLDER / "p.npy")
        quarn("pose", folder.run / "character.json", "--keys", folder.motion, "-o", folder.path / "m.json")
        quarn("bake", folder.path / "m.json", name, "--frames", f"1-{random_rig.FRAMES}", "--order", "file",
              "-o", FOLDER / "m.npy")
        for skin, targets, theirs in ((folder.skin, folder.targets, "p.npy"),
                                      (folder.motion_skin, folder.motion_targets, "m.npy")):
            assert difference(skin, FOLDER / theirs) < CLOSE, difference(skin, FOLDER / theirs)
            lifted = np.load(targets) - np.load(skin)
            assert np.abs(lifted - [0, 0, random_rig.LIFT]).max() < 1e-5


def state(thing: Any, armature: Any) -> List[Any]:
    """All that sampling touches."""
    scene, data = bpy.context.scene, armature.animation_data
    return [[[*map(tuple, (getattr(bone, name) for name in posing.CHANNELS)), bone.rotation_mode]
             for bone in armature.pose.bones],
            [constraint.mute for bone in armature.pose.bones for constraint in bone.constraints],
            [curve.mute for curve in data.drivers], data.action, data.use_nla, scene.frame_current,
            scene.frame_subframe, armature.matrix_world.copy(), armature["switch"],
            [modifier.show_viewport for modifier in thing.modifiers],
            [key.mute for key in thing.data.shape_keys.key_blocks], stack.evaluated_points(thing).tobytes()]


def test_all_is_put_back() -> None:
    thing, armature = new_arm()
    bpy.context.scene.frame_set(20, subframe=0.25)
    armature.pose.bones["hand"].driver_add("location", 1).driver.expression = "0.01"
    armature["switch"] = 2
    other = bpy.data.actions.new("other")  # is looked at for limits, and moves more than bones
    for path, index in (("location", 1), ('["switch"]', 0), ('pose.bones["upperArm"].rotation_euler', 1)):
        other.fcurves.new(path, index=index).keyframe_points.insert(1, 5)
    hand = armature.pose.bones["hand"]
    hand.constraints.remove(hand.constraints[0])
    hand.rotation_mode = "AXIS_ANGLE"
    hand.rotation_axis_angle = (0.5, 0.6, 0.0, 0.8)
    armature.pose.bones["forearm"].rotation_euler = (0.3, 0.0, 0.0)  # by hand, where the action has another
    bpy.context.view_layer.update()
    before = state(thing, armature)
    settings = sampling.Settings(samples=4, held_out=3, motion="motion")
    sampling.sample_all(thing, settings, lambda *_: None)
    assert state(thing, armature) == before, "after all of it"
    for stop in (("sampling motion", 40), ("sampling poses", 3)):
        work = sampling.sample(thing, settings, lambda *_: None)
        assert any((doing, done) == stop for doing, done, _ in work), f"there is no {stop}"
        work.close()  # type: ignore[attr-defined]
        assert state(thing, armature) == before, f"closed while {stop}"
        assert not run_folder.folder_of(thing).is_sampled
    # a frame in which the number of vertices is another
    mask = thing.modifiers.new("Mask", "MASK")
    mask.vertex_group = thing.vertex_groups.new(name="all").name
    thing.vertex_groups["all"].add(range(3682), 0.5, "REPLACE")
    mask.driver_add("threshold").driver.expression = "frame > 30"
    bpy.context.view_layer.update()
    before = state(thing, armature)
    said = refused(lambda: sampling.sample_all(thing, settings, lambda *_: None))
    assert re.fullmatch(r"arm: in frame 31 the modifiers make 0 vertices, and there are 3682: .*", said), said
    assert state(thing, armature) == before, "refused in the middle"


def to_front(modifier: Any) -> None:
    bpy.context.view_layer.objects.active = modifier.id_data
    bpy.ops.object.modifier_move_to_index(modifier=modifier.name, index=0)


# what is done to the arm, and what is said of it
REFUSED: Dict[str, Tuple[Callable[[Any, Any], Any], str]] = {
    "edit": (lambda thing, _: bpy.ops.object.mode_set(mode="EDIT"), "arm is in edit mode: .*"),
    "nothing": (lambda thing, _: [thing.modifiers.remove(thing.modifiers[1]), thing.shape_key_clear()],
                "arm has no modifier behind its armature .*"),
    "no armature": (lambda thing, _: thing.modifiers.remove(thing.modifiers[0]), "arm has no Armature modifier .*"),
    "two armatures": (lambda thing, _: setattr(thing.modifiers.new("Other", "ARMATURE"), "object",
                                               make_armature("other")), "arm needs one armature, .* Other has other"),
    "rest position": (lambda _, armature: setattr(armature.data, "pose_position", "REST"), "armRig shows its rest .*"),
    "mirror before": (lambda thing, _: to_front(thing.modifiers.new("Mirror", "MIRROR")),
                      "arm: the modifier Mirror makes 7\\d+ vertices of 3682 before the armature: .*"),
    "learned behind": (lambda thing, _: [thing.modifiers.new("Sub", "SUBSURF"), thing.modifiers.new("Cast", "CAST")],
                       "arm: the modifier Sub changes the number of vertices, and Cast stands behind it: .*"),
    "cloth before": (lambda thing, _: to_front(thing.modifiers.new("Cloth", "CLOTH")),
                     "arm: the modifier Cloth has a memory, and stands before the armature, .*"),
    "time": (lambda thing, _: thing.modifiers.new("Wave", "WAVE"), "arm: the modifier Wave depends on the frame, .*"),
    "switch": (lambda thing, _: thing.modifiers[1].driver_add("show_viewport"),
               "arm: a driver switches the modifier Corrective Smooth .*"),
    "driver": (lambda thing, _: setattr(thing.data.shape_keys.animation_data.drivers[0].driver, "expression", "(("),
               "arm: Blender does not run the driver of the shape key biceps: .*"),
    "excluded": (lambda thing, _: setattr(thing, "hide_viewport", True), "arm is disabled in the viewport, .*"),
}


def test_what_cannot_be_learned_is_refused() -> None:
    for name, (change, wanted) in REFUSED.items():
        thing, armature = new_arm()
        bpy.context.view_layer.objects.active = thing
        change(thing, armature)
        bpy.context.view_layer.update()
        shown = [modifier.show_viewport for modifier in thing.modifiers]
        said = refused(lambda: stack.read_stack(bpy.context.view_layer.objects.active))
        if thing != bpy.context.view_layer.objects.active:
            said = refused(lambda: stack.read_stack(thing))
        assert re.fullmatch(wanted, said), f"{name}: {said}"
        assert shown == [modifier.show_viewport for modifier in thing.modifiers], name


def test_what_is_learned() -> None:
    thing, armature = new_arm()
    thing.shape_key_add(name="by hand").value = 0.5
    for name, kind in (("Before", "CAST"), ("Off", "CAST"), ("Sub", "SUBSURF"), ("Solid", "SOLIDIFY")):
        thing.modifiers.new(name, kind)
    thing.modifiers["Off"].show_viewport = thing.modifiers["Off"].show_render = False
    to_front(thing.modifiers["Before"])
    found = stack.read_stack(thing)
    assert found.learned == ("Corrective Smooth",) and found.shape_keys == ("biceps", "wrist"), found
    assert found.left_out == ("Sub", "Solid") and len(found.notes) == 2, found
    assert found.muted_modifiers == ["Corrective Smooth", "Sub", "Solid"]


def test_a_linked_rig_is_refused_and_its_override_sampled() -> None:
    thing, armature = new_arm()
    collection = bpy.data.collections.new("Arm")
    for one in (thing, armature):
        collection.objects.link(one)
    bpy.data.libraries.write(str(FOLDER / "library.blend"), {collection})
    bpy.ops.wm.read_factory_settings(use_empty=True)
    bpy.ops.wm.save_as_mainfile(filepath=str(FOLDER / "shot.blend"))
    with bpy.data.libraries.load("//library.blend", link=True, relative=True) as (_, wanted):
        wanted.collections = ["Arm"]
    bpy.context.scene.collection.children.link(wanted.collections[0])
    bpy.context.view_layer.update()
    linked = wanted.collections[0].objects["arm"]
    said = refused(lambda: stack.read_stack(linked))
    assert said == "arm is linked from //library.blend: make a library override of object and mesh first", said
    wanted.collections[0].override_hierarchy_create(bpy.context.scene, bpy.context.view_layer)
    thing = next(one for one in bpy.data.objects if one.type == "MESH" and one.override_library)
    sampling.sample_all(thing, sampling.Settings(samples=4, held_out=3), lambda *_: None)
    folder = run_folder.folder_of(thing)
    assert folder.is_sampled and difference(folder.skin, folder.targets) > 0.01


def with_follower(armature: Any) -> None:
    without_limits(armature)
    copy = armature.pose.bones["hand"].constraints.new("COPY_ROTATION")
    copy.target, copy.subtarget = armature, "upperArm"


def without_limits(armature: Any) -> None:
    for bone in armature.pose.bones:
        while bone.constraints:
            bone.constraints.remove(bone.constraints[0])


def with_locks(armature: Any) -> None:
    without_limits(armature)
    bpy.data.actions.remove(bpy.data.actions[0])
    armature.pose.bones["hand"].lock_rotation = (False, True, True)


def test_limits() -> None:
    half = [-limits.DEFAULT, limits.DEFAULT]
    bend, twist = [0.0, 120.0], [-60.0, 60.0]
    cases: List[Tuple[str, Callable[[Any], Any], Dict[str, Dict[str, List[float]]]]] = [
        ("constraints", lambda armature: None,
         {"forearm": {"rotateX": bend}, "hand": {"rotateX": [-40.0, 40.0], "rotateY": twist}}),
        ("actions", without_limits, {"forearm": {"rotateX": [0.0, 118.0]},
                                     "hand": {"rotateX": [-30.0, 35.0], "rotateY": [-50.0, 50.0]}}),
        ("follower", with_follower, {"forearm": {"rotateX": [0.0, 118.0]}}),
        ("default", with_locks, {"forearm": {"rotateX": half, "rotateY": half, "rotateZ": half},
                                 "hand": {"rotateX": half}})]
    for name, change, wanted in cases:
        thing, armature = new_arm()
        change(armature)
        found_stack = stack.read_stack(thing)
        rig = sampling.Rig(thing, armature, found_stack, sampling.Settings(), run_folder.folder_of(thing), print)
        with stack.Switches(thing) as switches:
            character = sampling.character_at_rest(rig, switches)
        found, _ = limits.find_limits(armature, character)
        assert found.keys() == wanted.keys(), f"{name}: {found}"
        for joint, ranges in wanted.items():
            assert found[joint].keys() == ranges.keys(), f"{name}: {found}"
            assert all(np.allclose(found[joint][axis], ends, atol=0.6) for axis, ends in ranges.items()), found


def test_cloth_comes_to_rest_whatever_was_before() -> None:
    bpy.ops.wm.read_factory_settings(use_empty=True)
    bpy.ops.mesh.primitive_grid_add(x_subdivisions=12, y_subdivisions=4, size=0.6)
    thing, armature = bpy.context.object, make_armature("rig")
    for number, joint in enumerate(JOINTS):
        thing.vertex_groups.new(name=joint).add(
            [vertex.index for vertex in thing.data.vertices if int((vertex.co.x + 0.3) / 0.21) == number], 1, "REPLACE")
    thing.modifiers.new("Armature", "ARMATURE").object = armature
    cloth = thing.modifiers.new("Cloth", "CLOTH")
    cloth.settings.vertex_group_mass = "upperArm"
    found = stack.read_stack(thing)
    assert found.held == ("Cloth",)
    bpy.ops.wm.save_as_mainfile(filepath=str(FOLDER / "cloth.blend"))
    rig = sampling.Rig(thing, armature, found, sampling.Settings(hold=8), run_folder.folder_of(thing), print)
    (FOLDER / "caches").mkdir()
    files = (FOLDER / "caches" / "skin.npy", FOLDER / "caches" / "targets.npy")
    with stack.Switches(thing) as switches:
        character = sampling.character_at_rest(rig, switches)
        with posing.Posing(armature, character.joints, ["forearm"]) as posed, \
                sampling.Caches(files, 4, len(character.points)) as caches:
            for frame, bend in enumerate((0, 60, 0, 60)):
                posed.pose({"forearm": (radians(bend), 0.0, 0.0)})
                sampling.take_both(rig, caches, frame, switches)
    skin, targets = map(np.load, files)
    assert np.array_equal(targets[:2], targets[2:]) and np.array_equal(skin[:2], skin[2:])
    assert np.abs(targets - skin).max(axis=(1, 2)).min() > 0.01 and np.abs(targets[1] - targets[0]).max() > 0.1


def test_how_far_a_training_is() -> None:
    folder = run_folder.RunFolder(FOLDER / "watched.sampling")
    folder.run.mkdir(parents=True)
    states: List[Tuple[Dict[str, Any], str]] = [
        ({"state": "running", "step": "train", "number": 7, "of": 15, "what": "epochs", "done": 120, "total": 400,
          "secondsLeft": 125.0}, "train, step 7 of 15, epochs: 120 of 400, 2 minutes left"),
        ({"state": "running", "step": "play", "number": 9, "of": 15, "what": "", "done": 0, "total": 0,
          "secondsLeft": None}, "play, step 9 of 15"),
        ({"state": "done"}, "the training begins")]  # of the run before
    run_folder.write_json(folder.job, {"began": 1.0})
    for content, wanted in states:
        run_folder.write_json(folder.run / "progress.json", content)
        assert jobs.progress(folder) == wanted, jobs.progress(folder)
    run_folder.write_json(folder.run / "progress.json", states[0][0])
    os.utime(folder.run / "progress.json", (0.0, 0.0))
    assert jobs.progress(folder) == "the training begins", "of a run that was killed"


def main() -> None:
    os.environ["PATH"] = f"{QUARN.parent}{os.pathsep}{os.environ['PATH']}"
    for name, test in list(globals().items()):
        if name.startswith("test_"):
            test()
            print(f"passed: {name[5:].replace('_', ' ')}", flush=True)


if __name__ == "__main__":
    main()
