# SPDX-License-Identifier: Apache-2.0
"""The folder of a sampling and its training: NAME.sampling beside the .blend file, or in the folder of the preferences.
"""

from __future__ import annotations

import json
import os
from pathlib import Path
from typing import Any, Dict

import bpy

from . import preferences
from .character import node_names
from .refused import Refused


class RunFolder:
    """Names of its files. What quarn makes of it is in `run`, the folder of a quarn run."""

    def __init__(self, path: Path) -> None:
        self.path = path
        self.character = path / "character.glb"
        self.limits = path / "limits.json"
        self.recipe = path / "recipe.json"
        self.poses = path / "poses.json"  # the angles of the joints, frame by frame
        self.skin, self.targets = path / "skin.npy", path / "targets.npy"
        self.motion = path / "motion.json"
        self.motion_skin, self.motion_targets = path / "motion_skin.npy", path / "motion_targets.npy"
        self.rig = path / "blender.json"  # what a published model says of the mesh; there once all is sampled
        self.run = path / "run"
        self.log = path / "train.log"
        self.job, self.ended = path / "job.json", path / "ended"

    @property
    def is_sampled(self) -> bool:
        return self.rig.is_file()


def folder_of(thing: Any) -> RunFolder:
    """Of a mesh object. Refused where the file was not saved and the preferences name no folder."""
    return RunFolder(base_folder(thing) / f"{node_names([thing.name])[0]}.sampling")


def base_folder(thing: Any) -> Path:
    """Where folders of models and samplings go."""
    if bpy.data.filepath:
        return Path(bpy.path.abspath("//"))
    models = preferences.paths().models
    if not models:
        raise Refused(f"the file was never saved: save it, as what is sampled of {thing.name} goes beside it")
    return Path(models)


def write_json(path: Path, content: Dict[str, Any]) -> None:
    """As a whole, or not at all."""
    part = path.with_name(path.name + ".part")
    part.write_text(json.dumps(content, indent=1) + "\n", encoding="utf-8")
    os.replace(part, path)


def read_json(path: Path) -> Dict[str, Any]:
    """Empty where there is no such file, or none that can be read."""
    try:
        content = json.loads(path.read_text(encoding="utf-8"))
    except (OSError, ValueError):
        return {}
    return content if isinstance(content, dict) else {}
