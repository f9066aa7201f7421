# SPDX-License-Identifier: Apache-2.0
"""Published models, folders NAME.nwrp: where they are looked for, and what in them is Blender's, `rig/`."""

import json
import os
from dataclasses import dataclass
from pathlib import Path
from typing import Any, Iterator, List, Tuple

import bpy

from . import preferences
from .refused import Refused

FORMAT, VERSION = "neuralWarp Blender rig", 1


@dataclass(frozen=True)
class Rig:
    """What `rig/` says of the mesh and the armature that the model was made with."""

    folder: Path  # NAME.nwrp, absolute
    vertices: int
    topology: str  # stack.topology() of the mesh
    bones: Tuple[Tuple[str, str], ...]  # a bone, and its joint in the scene
    modifiers: Tuple[str, ...]  # what the model stands for: off while it is in use
    shape_keys: Tuple[str, ...]

    @property
    def scene(self) -> Path:
        return self.folder / "rig" / "scene.json"


def find(model: str) -> Path:
    """The folder of a model: as it is said, relative to the .blend file; by its name beside that file; in the folder of
    the preferences. Refused where it is in none of them."""
    if not model:
        raise Refused("no model is chosen: choose a folder NAME.nwrp")
    looked: List[Path] = []
    for place in _places(model):
        if (place / "metadata.json").is_file():
            return place
        looked.append(place)
    places = ", ".join(map(str, dict.fromkeys(looked)))
    raise Refused(f"there is no model {Path(model).name}; looked for {places}" if places else
                  f"{model} counts from the .blend file, which was never saved")


def _places(model: str) -> Iterator[Path]:
    blend = bpy.data.filepath
    said = bpy.path.abspath(model)
    if os.path.isabs(said):
        yield Path(os.path.normpath(said))
    elif blend:
        yield Path(os.path.normpath(os.path.join(os.path.dirname(blend), said)))
    name = os.path.basename(os.path.normpath(said.replace("\\", "/")))
    if blend:
        yield Path(blend).parent / name
    models = preferences.paths().models
    if models:
        yield Path(models) / name


def read_rig(folder: Path) -> Rig:
    """Refused where the folder was not published from Blender, or its blender.json is damaged."""
    path = folder / "rig" / "blender.json"
    try:
        with open(path, encoding="utf-8") as file:
            content = json.load(file)
    except FileNotFoundError:
        raise Refused(f"{folder.name} was not made in Blender: it has no {path.relative_to(folder)}") from None
    except (OSError, ValueError, RecursionError) as error:
        raise Refused(f"{path} cannot be read: {error}") from None
    if not isinstance(content, dict) or content.get("format") != FORMAT:
        raise Refused(f"{path} is no file of a {FORMAT}")
    if content.get("version") != VERSION:
        raise Refused(f"{path} has version {content.get('version')}; this add-on reads version {VERSION}")
    try:
        return _rig(folder, content)
    except (KeyError, TypeError, AttributeError) as error:
        raise Refused(f"{path} is damaged: {error!r}") from None


def _rig(folder: Path, content: Any) -> Rig:
    muted = content["muted"]
    bones = tuple((_text(entry["bone"]), _text(entry["joint"])) for entry in content["bones"])
    vertices = content["vertices"]
    if type(vertices) is not int:
        raise TypeError(f"vertices is {vertices!r}")
    return Rig(folder, vertices, _text(content["topology"]), bones, tuple(map(_text, muted["modifiers"])),
               tuple(map(_text, muted["shapeKeys"])))


def _text(value: Any) -> str:
    if not isinstance(value, str):
        raise TypeError(f"{value!r} is no text")
    return value
