# SPDX-License-Identifier: Apache-2.0
"""What a frame takes in Blender above the armature alone, with a model in use and with Corrective Smooth, in turns:

    blender -b --factory-startup --python-exit-code 1 --python bench/blender_frame.py -- QUARN MODULE

QUARN is the program, MODULE the folder with neuralwarp/. The mesh is a tube with a chain of bones that all turn; the
model has the size of a trained one, two layers of 512, 50 principal shapes, Surface with 10 smoothing passes; its
numbers mean nothing. As the trainer writes it, the network asks for one thread.
"""

import json
import statistics
import subprocess
import sys
import tempfile
import time
from math import cos, pi, sin
from pathlib import Path
from typing import Any, Dict, List

import bpy
import numpy as np

ROOT = Path(__file__).resolve().parents[1]
QUARN, MODULE = sys.argv[sys.argv.index("--") + 1:]
sys.path[:0] = [str(ROOT / "clients" / "blender"), MODULE]

import neuralwarp_blender  # noqa: E402
from neuralwarp_blender import character, live, stack  # noqa: E402

BONES, LENGTH, RADIUS = 25, 5.0, 0.4
LAYERS, SHAPES, PASSES = (512, 512), 50, 10
ROUNDS, FRAMES = 7, 12  # of a round the first two frames are not counted
SHOWN = ("ARMATURE", "NEURAL", "ORIGINAL")


def make_tube(count: int) -> Any:
    """A mesh object of about `count` vertices on a chain of bones, with a Corrective Smooth of 10 passes behind."""
    bpy.ops.wm.read_factory_settings(use_empty=True)
    neuralwarp_blender.register()
    around = max(8, int((count * 2 * pi * RADIUS / LENGTH) ** 0.5))
    rings = count // around
    points = [(RADIUS * cos(2 * pi * k / around), RADIUS * sin(2 * pi * k / around), LENGTH * ring / (rings - 1))
              for ring in range(rings) for k in range(around)]
    faces = [[around * (ring + up) + (k + turn) % around for up, turn in ((0, 0), (0, 1), (1, 1), (1, 0))]
             for ring in range(rings - 1) for k in range(around)]
    mesh = bpy.data.meshes.new("tube")
    mesh.from_pydata(points, [], faces)
    thing = bpy.data.objects.new("tube", mesh)
    bpy.context.scene.collection.objects.link(thing)
    armature = make_chain()
    heights = np.repeat(np.linspace(0.0, BONES, rings), around)
    for bone in range(BONES):
        group = thing.vertex_groups.new(name=f"bone{bone}")
        weights = np.clip(1.0 - np.abs(heights - bone - 0.5), 0.0, 1.0)
        for vertex in np.flatnonzero(weights > 0.0):
            group.add([int(vertex)], float(weights[vertex]), "REPLACE")
    thing.modifiers.new("Armature", "ARMATURE").object = armature
    smooth = thing.modifiers.new("Corrective Smooth", "CORRECTIVE_SMOOTH")
    smooth.iterations, smooth.factor = 10, 0.5
    return thing


def make_chain() -> Any:
    armature = bpy.data.objects.new("chain", bpy.data.armatures.new("chain"))
    bpy.context.scene.collection.objects.link(armature)
    bpy.context.view_layer.objects.active = armature
    bpy.ops.object.mode_set(mode="EDIT")
    parent = None
    for number in range(BONES):
        bone = armature.data.edit_bones.new(f"bone{number}")
        bone.head, bone.tail = (0, 0, LENGTH * number / BONES), (0, 0, LENGTH * (number + 1) / BONES)
        bone.parent, parent = parent, bone
    bpy.ops.object.mode_set(mode="OBJECT")
    for bone in armature.pose.bones:
        bone.rotation_mode = "XYZ"
        for frame, angle in ((1, 0.0), (2 * FRAMES, 0.1)):
            bone.rotation_euler.x = angle
            bone.keyframe_insert("rotation_euler", frame=frame)
    return armature


def publish(thing: Any, folder: Path) -> None:
    looked = stack.read_stack(thing)
    with stack.Switches(thing) as switches:
        made = character.read_character(thing, thing.modifiers[0].object, looked, switches)
    (folder / "rig").mkdir(parents=True)
    character.write_character(made, folder / "tube.glb")
    subprocess.run([QUARN, "import", str(folder / "tube.glb"), "-o", str(folder / "rig" / "scene.json"), "--quiet",
                    "--neural-warp"], check=True, stdout=subprocess.DEVNULL)
    (folder / "rig" / "blender.json").write_text(json.dumps({
        "format": "neuralWarp Blender rig", "version": 1, "vertices": len(made.points),
        "topology": stack.topology(thing.data), "muted": {"modifiers": list(looked.learned), "shapeKeys": []},
        "bones": [{"bone": joint.bone, "joint": joint.name} for joint in made.joints]}))
    import neuralwarp
    with neuralwarp.Scene.open(folder / "rig" / "scene.json") as scene:
        write_network(folder / "model.onnx", len(scene.controls()))
    count = len(made.points)
    numbers = np.random.default_rng(1).integers(1, 9, 3 * count * SHAPES)
    (folder / "principal_shapes.json").write_text(
        f'{{"principalShapeCount": {SHAPES}, "vertCount": {count}, "principalShapes": ['
        + ",".join("[" + ",".join(f"{value}e-4" for value in shape) + "]"
                   for shape in numbers.reshape(SHAPES, -1)) + "]}")
    (folder / "metadata.json").write_text(json.dumps({
        "deltaMode": 1, "smoothingIterations": PASSES, "fullCount": count, "affectCount": count, "deltaCount": count,
        "subsetState": "complete", "componentTagExpression": "*", "geometry": made.mesh}))


def write_network(path: Path, controls: int) -> None:
    import onnx
    from onnx import helper, numpy_helper
    widths, random = (controls, *LAYERS, SHAPES), np.random.default_rng(2)
    nodes, tensors, name = [], [], "controls"
    for layer, (before, after) in enumerate(zip(widths, widths[1:])):
        tensors.append(numpy_helper.from_array(
            (random.standard_normal((before, after)) / before ** 0.5).astype(np.float32), f"weights{layer}"))
        nodes.append(helper.make_node("MatMul", [name, f"weights{layer}"], [f"sum{layer}"]))
        name = f"sum{layer}"
        if layer < len(LAYERS):
            nodes += [helper.make_node("Sigmoid", [name], [f"gate{layer}"]),
                      helper.make_node("Mul", [name, f"gate{layer}"], [f"layer{layer}"])]
            name = f"layer{layer}"
    graph = helper.make_graph(nodes, "tube", [helper.make_tensor_value_info("controls", 1, [controls])],
                              [helper.make_tensor_value_info(name, 1, [SHAPES])], tensors)
    model = helper.make_model(graph, opset_imports=[helper.make_opsetid("", 13)], ir_version=7)
    helper.set_model_props(model, {"ort_config": json.dumps({"session_options": {"intra_op_num_threads": 1}})})
    onnx.save(model, str(path))


def measure(thing: Any) -> Dict[str, float]:
    """Milliseconds a frame, medians, by what is shown."""
    times: Dict[str, List[float]] = {shown: [] for shown in SHOWN}
    for _ in range(ROUNDS):
        for shown in SHOWN:
            thing.neuralwarp.show = shown
            for frame in range(1, FRAMES + 1):
                begin = time.perf_counter()
                bpy.context.scene.frame_set(frame)
                if frame > 2:
                    times[shown].append(1e3 * (time.perf_counter() - begin))
            if live.problem(thing):
                sys.exit(live.problem(thing))
    return {shown: statistics.median(values) for shown, values in times.items()}


def main() -> None:
    print("vertices  armature  + neural  + Corrective Smooth   (ms a frame, medians)")
    for count in (2000, 50000):
        with tempfile.TemporaryDirectory() as work:
            thing = make_tube(count)
            folder = Path(work) / "tube.nwrp"
            publish(thing, folder)
            live.use(thing, str(folder))
            found = measure(thing)
            alone = found["ARMATURE"]
            print(f"{len(thing.data.vertices):8} {alone:9.2f} {found['NEURAL'] - alone:9.2f} "
                  f"{found['ORIGINAL'] - alone:12.2f}", flush=True)
            neuralwarp_blender.unregister()


if __name__ == "__main__":
    main()
