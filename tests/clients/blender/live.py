# SPDX-License-Identifier: Apache-2.0
"""Tests of models in use, without a window: blender -b --factory-startup --python live.py -- FOLDER QUARN MODULE."""

import json
import re
import shutil
import sys
from pathlib import Path
from typing import Any, Callable, List

import addon_utils
import bmesh
import bpy
import numpy as np
from mathutils import Euler

HERE = Path(__file__).resolve().parent
ROOT = HERE.parents[2]
FOLDER, QUARN, MODULE = (Path(word) for word in sys.argv[sys.argv.index("--") + 1:])
sys.path[:0] = [str(HERE), str(ROOT / "clients" / "blender"), str(MODULE)]

import arm_model  # noqa: E402
import neuralwarp  # noqa: E402
from neuralwarp_blender import bake, deformation, live, module, pose, stack  # noqa: E402
from neuralwarp_blender.deformation import Points  # noqa: E402
from rebuilt_arm import arm_points, rebuild_arm  # noqa: E402

ADDON, FRAME = "neuralwarp_blender", 20  # in which the elbow is at 90 degrees
MODEL = FOLDER / "arm.nwrp"


def arm() -> Any:
    """By its name each time: undo and files put another in its place."""
    return bpy.data.objects["arm", None]


def points(thing: Any = None) -> Points:
    return stack.evaluated_points(thing or arm())


def shown(how: str, thing: Any = None) -> Points:
    (thing or arm()).neuralwarp.show = how
    return points(thing)


def go_to(frame: int) -> None:
    bpy.context.scene.frame_set(frame)


def activate(thing: Any) -> None:
    bpy.context.view_layer.objects.active = thing
    thing.select_set(True)


def open_arm(model: str = "arm.nwrp") -> None:
    """The arm, and the model in use; without a model not in use."""
    bpy.ops.wm.open_mainfile(filepath=str(FOLDER / "arm.blend"))
    activate(arm())
    if model:
        bpy.ops.neuralwarp.use(model=model)
    go_to(FRAME)


def refused(work: Callable[[], Any]) -> str:
    try:
        work()
    except RuntimeError as error:
        return str(error)
    return "not refused"


def is_off() -> List[bool]:
    """What the model stands for."""
    smooth = arm().modifiers["Corrective Smooth"]
    keys = arm().data.shape_keys.key_blocks[1:]
    return [not smooth.show_viewport, not smooth.show_render, *(key.mute for key in keys)]


def expected(skin: Points, **options: Any) -> Points:
    """The module's result for the pose of the armature, with controls of a scene whose joints are set by angles."""
    with neuralwarp.Scene.open(MODEL / "rig" / "scene.json") as scene:
        for bone in bpy.data.objects["armRig"].evaluated_get(bpy.context.evaluated_depsgraph_get()).pose.bones:
            for axis, angle in zip("XYZ", bone.matrix_basis.to_euler()):
                scene.set(f"{bone.name}.rotate{axis}", angle)
        controls, working = scene.controls(), live.state(arm())
        assert working is not None and working.controls is not None
        assert np.abs(controls - working.controls).max() < 1e-6, (controls, working.controls)
        made = neuralwarp.Deformer(working.model, scene.faces("arm.outMesh"), scene.points("arm.outMesh"))
    return made.evaluate(skin, working.controls, **options)


def test_result() -> None:
    """Exactly the module's: in frames, after a bone was moved by hand, by envelope and weights, again and again."""
    open_arm()
    bpy.context.scene.collection.objects.link(bpy.data.objects.new("aside", None))
    for frame in (1, FRAME, FRAME, 47, 80):
        go_to(frame)
        found = points()
        skin = shown("ARMATURE")
        assert np.array_equal(shown("NEURAL"), found) and np.array_equal(expected(skin), found), frame
        assert np.abs(found - skin).max() > 0.01
        bpy.data.objects["aside"].location.x += 1.0  # the arm is not evaluated again
        assert np.array_equal(points(), found)
    original = shown("ORIGINAL")
    assert not any(is_off()) and not np.array_equal(original, skin)
    shown("NEURAL")
    assert all(is_off())
    bpy.data.objects["armRig"].animation_data.action = None
    bpy.data.objects["armRig"].pose.bones["forearm"].rotation_euler.x = 0.7
    by_hand = points()
    assert np.array_equal(expected(shown("ARMATURE")), by_hand) and not np.array_equal(by_hand, found)
    shown("NEURAL")
    group = arm().vertex_groups["hand"].index
    weights = np.array([sum(one.weight for one in vertex.groups if one.group == group)
                        for vertex in arm().data.vertices], dtype=np.float32)
    arm().neuralwarp.envelope, arm().neuralwarp.vertex_group = 0.25, "hand"
    faded = points()
    assert np.array_equal(expected(shown("ARMATURE"), envelope=0.25, weights=weights), faded)
    shown("NEURAL")
    rest = np.empty(3 * len(weights), dtype=np.float32)
    arm().data.vertices.foreach_get("co", rest)
    assert np.array_equal(rest.reshape(-1, 3), arm_points().astype(np.float32))  # the original mesh
    arm().neuralwarp.vertex_group = ""
    for frame, envelope in ((1, 0.0), (3, 1.0)):  # nothing else moves
        arm().neuralwarp.envelope = envelope
        arm().keyframe_insert("neuralwarp.envelope", frame=frame)
    arm().animation_data.action.fcurves[0].keyframe_points[0].interpolation = "LINEAR"
    go_to(2)
    half = points()
    assert np.array_equal(expected(shown("ARMATURE"), envelope=0.5), half)
    shown("NEURAL")
    go_to(3)
    assert np.array_equal(points(), by_hand)
    arm().neuralwarp.vertex_group = "none"
    points()
    assert "no vertex group none" in live.problem(arm())


def test_seams() -> None:
    """Vertices that the scene joins, as they lie at one place with one skin, move as one."""
    open_arm()
    whole = points()
    bpy.ops.neuralwarp.stop()
    count = len(whole)
    cut = bmesh.new()
    cut.from_mesh(arm().data)
    bmesh.ops.split_edges(cut, edges=[edge for edge in cut.edges if edge.calc_face_angle() > 0.15])
    cut.to_mesh(arm().data)
    folder = FOLDER / "seam.nwrp"
    arm_model.publish_arm(arm(), folder, str(QUARN))
    bpy.ops.neuralwarp.use(model=str(folder))
    found = points()
    assert len(found) > count + 100 and not live.problem(arm()), live.problem(arm())
    _, twin = np.unique(np.round(deformation.rest_points(arm()), 6), axis=0, return_inverse=True)
    _, wanted = np.unique(np.round(arm_points(), 6), axis=0, return_inverse=True)
    assert np.abs(found - whole[np.argsort(wanted)][twin]).max() < 1e-6


def test_render() -> None:
    """Three frames of a render have the same mesh as the viewport."""
    open_arm()
    seen, wanted = [], []

    def look(scene: Any, depsgraph: Any) -> None:
        if depsgraph.mode == "RENDER":
            mesh = arm().evaluated_get(depsgraph).data
            flat = np.empty(3 * len(mesh.vertices), dtype=np.float32)
            mesh.vertices.foreach_get("co", flat)
            seen.append(flat.reshape(-1, 3))

    scene = bpy.context.scene
    assert scene.render.use_lock_interface
    camera = bpy.data.objects.new("camera", bpy.data.cameras.new("camera"))
    scene.collection.objects.link(camera)
    camera.location, camera.rotation_euler = (0.5, -3.0, 1.0), (1.57, 0.0, 0.0)
    scene.camera, scene.render.engine, scene.cycles.samples, scene.cycles.use_denoising = camera, "CYCLES", 1, False
    scene.render.resolution_x = scene.render.resolution_y = 16
    scene.render.filepath, scene.frame_start, scene.frame_end = str(FOLDER / "render") + "/", FRAME, FRAME + 2
    bpy.app.handlers.frame_change_post.append(look)
    bpy.ops.render.render(animation=True)
    bpy.app.handlers.frame_change_post.remove(look)
    for frame in range(FRAME, FRAME + 3):
        go_to(frame)
        wanted.append(points())
    assert np.array_equal(seen, wanted) and not np.array_equal(wanted[0], wanted[2])


def test_refusals() -> None:
    """A sentence each, and nothing has changed."""
    open_arm(model="")
    bad = FOLDER / "bad.nwrp"
    shutil.copytree(MODEL, bad)
    rig = json.loads((bad / "rig" / "blender.json").read_text())

    def using(**changed: Any) -> Callable[[], Any]:
        def use() -> None:
            (bad / "rig" / "blender.json").write_text(json.dumps({**rig, **changed}))
            bpy.ops.neuralwarp.use(model=str(bad))
        return use

    bones = [{"bone": "hand", "joint": "nix"}]
    for wanted, work in (
            ("no model is chosen", lambda: bpy.ops.neuralwarp.use()),
            ("no model x.nwrp; looked for .*a/x.nwrp, .*/x.nwrp", lambda: bpy.ops.neuralwarp.use(model="a/x.nwrp")),
            ("bad.nwrp is for a mesh of 7 vertices, and arm has 3682", using(vertices=7)),
            ("mesh of other polygons than arm has", using(topology="00")),
            ("has version 2; this add-on reads version 1", using(version=2)),
            ("is no file of a neuralWarp Blender rig", using(format="x")),
            ("armRig has no bone nix", using(bones=[{"bone": "nix", "joint": "hand"}])),
            ("has no joint nix, which the bone hand", using(bones=bones)),
            ("damaged: .*'modifiers'", using(muted={})),
            ("damaged: .*no text", using(topology=3)),
            ("arm is not in use: nothing can be baked", lambda: bpy.ops.neuralwarp.bake()),
            ("arm.blend is no PC2 file", lambda: bpy.ops.neuralwarp.show_cache(filepath=str(FOLDER / "arm.blend")))):
        said = refused(work)
        assert re.search(wanted, said), (wanted, said)
        assert not arm().neuralwarp.in_use and not any(is_off()), wanted
    (bad / "rig" / "blender.json").write_text(json.dumps(rig))
    (bad / "model.onnx").write_text("none")
    assert "model.onnx" in refused(lambda: bpy.ops.neuralwarp.use(model=str(bad)))
    other = bpy.data.objects.new("other", arm().data)
    assert "too, whose shape keys" in refused(lambda: bpy.ops.neuralwarp.use(model="arm.nwrp")) and other
    assert "is not installed for this Python (CPython 3." in module.explanation(ImportError("no"))
    (FOLDER / "neuralwarp").mkdir()
    (FOLDER / "neuralwarp" / "_core.cpython-399-x86_64-linux-gnu.so").touch()
    module.LIBRARY = FOLDER
    assert "is for cpython-399-x86_64-linux-gnu; this Blender has CPython 3." in module.explanation(ImportError("no"))


def test_life() -> None:
    """Edit mode, undo, new names, the add-on off and on, copies, save and reload."""
    open_arm()
    wanted = points()
    bpy.ops.object.mode_set(mode="EDIT")
    go_to(FRAME + 1)
    bpy.ops.object.mode_set(mode="OBJECT")
    go_to(FRAME)
    assert np.array_equal(points(), wanted)
    bpy.ops.ed.undo_push(message="whole")
    bpy.ops.object.mode_set(mode="EDIT")
    cut = bmesh.from_edit_mesh(arm().data)
    cut.faces.ensure_lookup_table()
    bmesh.ops.delete(cut, geom=[cut.faces[0]], context="FACES_ONLY")
    bmesh.update_edit_mesh(arm().data)
    bpy.ops.object.mode_set(mode="OBJECT")
    points()
    assert "other polygons than arm has" in live.problem(arm())
    bpy.ops.ed.undo_push(message="cut")
    bpy.ops.ed.undo()
    assert np.array_equal(points(), wanted) and not live.problem(arm())
    bpy.ops.ed.undo_push(message="in use")
    bpy.ops.neuralwarp.stop()
    bpy.ops.ed.undo_push(message="stopped")
    assert not any(is_off()) and not np.array_equal(points(), wanted)
    bpy.ops.ed.undo()
    assert all(is_off()) and np.array_equal(points(), wanted)

    thing = arm()
    thing.name = "sleeve"
    go_to(FRAME + 1)
    go_to(FRAME)
    assert np.array_equal(points(thing), wanted)
    thing.name = "arm"
    addon_utils.disable(ADDON)
    assert not any(is_off()) and not np.array_equal(points(), wanted)
    for _ in range(2):
        addon_utils.enable(ADDON, default_set=True)
        go_to(FRAME + 1)
        go_to(FRAME)
        assert all(is_off()) and np.array_equal(points(), wanted)
    bpy.data.objects["armRig"].select_set(True)
    activate(arm())
    bpy.ops.object.duplicate()
    go_to(FRAME + 1)
    go_to(FRAME)
    two = bpy.context.object
    assert two != arm() and np.array_equal(points(two), wanted) and np.array_equal(points(), wanted)
    bpy.ops.neuralwarp.stop()
    assert np.array_equal(points(), wanted) and not np.array_equal(points(two), wanted)
    bpy.ops.wm.save_as_mainfile(filepath=str(FOLDER / "used.blend"))
    bpy.ops.wm.open_mainfile(filepath=str(FOLDER / "used.blend"))
    assert np.array_equal(points(), wanted)
    MODEL.rename(FOLDER / "away.nwrp")
    bpy.ops.neuralwarp.reload()
    points()
    assert "there is no model arm.nwrp" in live.problem(arm())
    (FOLDER / "away.nwrp").rename(MODEL)
    bpy.ops.neuralwarp.reload()
    assert np.array_equal(points(), wanted)


def test_other_files() -> None:
    """Appended, linked, and overridden; the model is found by the preferences."""
    open_arm()
    wanted = points()
    bpy.ops.wm.save_as_mainfile(filepath=str(FOLDER / "used.blend"))
    for is_linked in (False, True):
        bpy.ops.wm.read_factory_settings(use_empty=True)
        addon_utils.enable(ADDON, default_set=True)
        with bpy.data.libraries.load(str(FOLDER / "used.blend"), link=is_linked) as (_, chosen):
            chosen.objects = ["arm", "armRig"]
        for thing in chosen.objects:
            bpy.context.scene.collection.objects.link(thing)
        if is_linked:
            break
        go_to(FRAME)
        assert "never saved" in live.problem(arm())
        bpy.context.preferences.addons[ADDON].preferences.models_path = str(FOLDER)
        bpy.ops.neuralwarp.reload()
        assert np.array_equal(points(), wanted)
    linked = chosen.objects[0]
    activate(linked)
    assert "arm is linked from" in refused(lambda: bpy.ops.neuralwarp.use(model=str(MODEL)))
    armature, thing = (one.override_create(remap_local_usages=True) for one in reversed(chosen.objects))
    thing.modifiers["Armature"].object = armature
    activate(thing)
    assert "arm, the mesh of arm, is linked from" in refused(lambda: bpy.ops.neuralwarp.use(model=str(MODEL)))
    thing.data.override_create(remap_local_usages=True)
    bpy.ops.neuralwarp.use(model=str(MODEL))
    go_to(FRAME)
    assert np.array_equal(points(), wanted)
    bpy.ops.wm.save_as_mainfile(filepath=str(FOLDER / "override.blend"))
    bpy.ops.wm.open_mainfile(filepath=str(FOLDER / "override.blend"))
    assert all(is_off()) and np.array_equal(points(), wanted)


def test_bake() -> None:
    """What a colleague sees without the add-on, to the bit; a Subdivision Surface stays behind it."""
    open_arm()
    wanted = []
    for frame in range(FRAME, FRAME + 4):
        go_to(frame)
        wanted.append(points())
    arm().modifiers.new("Subdivision", "SUBSURF").show_viewport = False
    bpy.ops.neuralwarp.bake(kind="SHAPE_KEYS", first=FRAME, last=FRAME + 3)
    arm().neuralwarp.show = "ARMATURE"
    assert "shows armature" in refused(lambda: bpy.ops.neuralwarp.bake(first=FRAME, last=FRAME + 3))
    arm().neuralwarp.show = "NEURAL"
    bpy.ops.neuralwarp.bake(filepath="//baked.pc2", first=FRAME, last=FRAME + 3)
    assert not arm().neuralwarp.in_use and bake.MODIFIER == arm().modifiers[-2].name
    assert [modifier.name for modifier in bpy.data.objects["arm baked"].modifiers] == ["Subdivision"]
    bpy.ops.wm.save_as_mainfile(filepath=str(FOLDER / "baked.blend"))
    addon_utils.disable(ADDON)
    bpy.ops.wm.open_mainfile(filepath=str(FOLDER / "baked.blend"))
    for row, frame in enumerate(range(FRAME, FRAME + 4)):
        go_to(frame)
        for name in ("arm", "arm baked"):
            assert np.array_equal(points(bpy.data.objects[name]), wanted[row]), (frame, name)
    addon_utils.enable(ADDON, default_set=True)
    cut = FOLDER / "cut.pc2"
    cut.write_bytes((FOLDER / "baked.pc2").read_bytes()[:-1])
    activate(arm())
    assert "it says 4 frames of 3682" in refused(lambda: bpy.ops.neuralwarp.show_cache(filepath=str(cut)))


def test_angles() -> None:
    """Of all orders, at right angles of the middle one too; scales, mirrors and inverses."""
    random = np.random.default_rng(1)
    for order in ("XYZ", "YZX", "ZXY", "XZY", "YXZ", "ZYX"):
        for turn in [*random.uniform(-3.0, 3.0, (20, 3)), np.full(3, np.pi / 2), np.array([0.3, -np.pi / 2, 0.3])]:
            wanted = np.array(Euler(turn, order).to_matrix()).T
            found = pose.angles(wanted[None], [order.lower()])[0]
            assert np.abs(np.array(Euler(found, order).to_matrix()).T - wanted).max() < 1e-6, (order, turn, found)
    matrices = random.standard_normal((50, 4, 4))
    matrices[:, :, 3] = [0.0, 0.0, 0.0, 1.0]
    assert np.abs(pose.inverses(matrices) @ matrices - np.eye(4)).max() < 1e-9
    scale, rotation = pose.split(matrices)
    assert np.abs(scale[:, :, None] * rotation - matrices[:, :3, :3]).max() < 1e-12
    assert np.array_equal(scale[:, 0] < 0.0, np.linalg.det(matrices[:, :3, :3]) < 0.0)


def main() -> None:
    bpy.ops.wm.read_factory_settings(use_empty=True)
    addon_utils.enable(ADDON, default_set=True)
    rebuild_arm()
    bpy.ops.wm.save_as_mainfile(filepath=str(FOLDER / "arm.blend"))
    arm_model.publish_arm(arm(), MODEL, str(QUARN))
    tests = [value for name, value in globals().items() if name.startswith("test_")]
    for test in tests:
        test()
        print(f"{test.__name__}: good", flush=True)
    print(f"passed {len(tests)} tests")


if __name__ == "__main__":
    main()
