# SPDX-License-Identifier: Apache-2.0
"""What a target program is told of a scene, read from the scene file (docs/sceneFiles.md)."""

import json
import re
from pathlib import Path
from typing import Any, NamedTuple

from ..errors import FarmError


class Scene(NamedTuple):
    """A deformer's geometry, and where its points come from."""
    skin: str               # the plug of the mesh as joints and weights move it
    rest: str               # the plug of the mesh at rest
    character: str          # the file that the scene was imported from, or ""
    meters_per_unit: float


def read_scene(path: Path, deformer: str, geometry: str) -> Scene:
    """geometry: the name of the mesh. Throws FarmError where no skin of quarn's moves it."""
    try:
        content = json.loads(path.read_bytes())
        sources: dict[str, str] = {str(to): str(source) for source, to, *_ in content["connections"]}
        nodes: list[dict[str, Any]] = content["nodes"]
    except (ValueError, KeyError, TypeError):
        raise FarmError(f"{path} is no scene file that can be read") from None
    skin, rest = plugs(path, sources, deformer, geometry)
    if any(node.get("type") == "pointCache" and node.get("name") == skin.split(".")[0] for node in nodes):
        raise FarmError(f"{path}: the skin of {geometry} is another tool's cache ({skin}), and a target program gets "
                        "quarn's: give the scene as it was before quarn target --skin")
    values: dict[str, Any] = next((node.get("values", {}) for node in nodes if node.get("type") == "character"), {})
    source = values.get("sourceFile", "")
    return Scene(skin, rest, str((path.parent / source).resolve()) if source else "",
                 float(values.get("metersPerUnit", 1.0)))


def plugs(path: Path, sources: dict[str, str], deformer: str, geometry: str) -> tuple[str, str]:
    """Of skin and rest: what comes into the deformer's element whose original geometry is the mesh of that name."""
    for to, rest in sources.items():
        found = re.fullmatch(re.escape(deformer) + r"\.originalGeometry\[(\d+)\]", to)
        if found and rest.split(".")[0] == geometry:
            skin = sources.get(f"{deformer}.input[{found[1]}].inputGeometry")
            if skin:
                return skin, rest
    raise FarmError(f"{path}: nothing moves {geometry} before {deformer}: there is no skin for a target program")
