"""packed_module.py PLACE WAVE, by a Python or, behind "--", by Blender, which has it from the add-on: the module
neuralwarp is that of PLACE, with its libraries, and computes what the host computes on the example of the wave."""

import ast
import importlib
import sys
from pathlib import Path


def mapped() -> "set[Path]":
    lines = Path("/proc/self/maps").read_text().splitlines()
    return {Path(line.split(maxsplit=5)[5]) for line in lines if ".so" in line}


def enabled_add_on() -> None:
    import addon_utils

    def refuse(error: Exception) -> None:
        raise error

    add_on = addon_utils.enable("neuralwarp_blender", handle_error=refuse)
    version = ast.literal_eval((Path(__file__).parents[2] / "VERSION").read_text().strip().replace(".", ","))
    assert add_on.bl_info["version"] == version, add_on.bl_info
    importlib.import_module("neuralwarp_blender.module").find()


place, wave = (Path(name).resolve() for name in sys.argv[-2:])
before = mapped()
if "--" in sys.argv:
    enabled_add_on()
import neuralwarp  # noqa: E402

assert place in Path(neuralwarp.__file__).resolve().parents, neuralwarp.__file__
