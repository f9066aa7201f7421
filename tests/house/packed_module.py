"""packed_module.py [ZIP] PLACE WAVE: the module neuralwarp is that of PLACE, with its libraries, and computes what the
host computes on the example of the wave. In Blender the add-on ZIP is installed first, and brings the module."""

import ast
import importlib
import sys
from pathlib import Path

import numpy as np


def mapped() -> "set[Path]":
    lines = Path("/proc/self/maps").read_text().splitlines()
    return {Path(line.split(maxsplit=5)[5]) for line in lines if ".so" in line}


def stem(file: Path) -> str:
    return file.name.partition(".so")[0]


def install_add_on(path: str) -> None:
    import addon_utils
    import bpy

    def refuse(error: Exception) -> None:
        raise error

    bpy.ops.preferences.addon_install(filepath=path)
    add_on = addon_utils.enable("neuralwarp_blender", handle_error=refuse)
    version = ast.literal_eval((Path(__file__).parents[2] / "VERSION").read_text().strip().replace(".", ","))
    assert add_on.bl_info["version"] == version, add_on.bl_info
    importlib.import_module("neuralwarp_blender.module").find()


place, wave = (Path(name).resolve() for name in sys.argv[-2:])
before = mapped()
if "--" in sys.argv:
    install_add_on(sys.argv[-3])
import neuralwarp  # noqa: E402

assert place in Path(neuralwarp.__file__).resolve().parents, neuralwarp.__file__
model = neuralwarp.Model.load(wave / "models" / "wave.nwrp")
with neuralwarp.Scene.open(wave / "wave.json") as scene:
    rest = scene.points("strip.outMesh")
    deformer = neuralwarp.Deformer(model, scene.faces("strip.outMesh"), rest)
    scene.set("controls.inputList[0].input[0]", 1.0)
    deformed = deformer.evaluate(rest, scene.controls())
    assert np.array_equal(deformed, scene.points("wave.outputGeom[0]"))
assert np.abs(deformed - rest).max() > 0.1, "the wave is flat"

# no library is loaded from elsewhere that is carried along, but for those that were loaded before
carried = {stem(file) for file in Path(neuralwarp.__file__).parent.glob("*.so*")} - {stem(file) for file in before}
foreign = [file for file in mapped() - before if stem(file) in carried and place not in file.parents]
assert not foreign, foreign
