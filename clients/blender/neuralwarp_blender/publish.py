# SPDX-License-Identifier: Apache-2.0
"""Publish: a trained model becomes the folder NAME.nwrp beside the .blend file, with what Blender needs to use it in
`rig/`: the scene of quarn with the joints at rest, and `blender.json` on mesh, bones, and what is to be switched off.
"""

from __future__ import annotations

import os
import shutil
import subprocess
from pathlib import Path
from typing import Any, Dict, List

from . import jobs, preferences
from .character import node_names
from .refused import Refused
from .run_folder import RunFolder, base_folder, folder_of, read_json, write_json
from .stack import topology


def publish(thing: Any) -> Path:
    """Of a mesh object whose training is done. The folder is there as a whole, and replaces one of that name. Refused
    where there is no model, or one of another mesh."""
    folder = folder_of(thing)
    state = jobs.status(folder).state
    if state != "done":
        raise Refused(f"{thing.name} has no model to publish: " +
                      ("its training was not done to the end" if state != "none" else "it was not trained"))
    facts = read_json(folder.rig)
    check_mesh(thing, facts)
    name = node_names([thing.name])[0]
    model = folder.run / "models" / f"{name}.nwrp"
    if not (model / "metadata.json").is_file():
        raise Refused(f"{model} is no model")
    place = base_folder(thing) / f"{name}.nwrp"
    part = place.with_name(place.name + ".part")
    shutil.rmtree(part, ignore_errors=True)
    try:
        shutil.copytree(model, part)
        (part / "rig").mkdir()
        write_scene(folder, part / "rig" / "scene.json")
        write_json(part / "rig" / "blender.json", facts)
        replace(part, place)
    except OSError as error:
        raise Refused(f"{place} cannot be written: {error.strerror or error}") from None
    finally:
        shutil.rmtree(part, ignore_errors=True)
    return place


def check_mesh(thing: Any, facts: Dict[str, Any]) -> None:
    count = len(thing.data.vertices)
    if count != facts.get("vertices"):
        raise Refused(f"the model was made of {facts.get('vertices')} vertices, and {thing.name} has {count}: sample "
                      "and train again")
    if topology(thing.data) != facts.get("topology"):
        raise Refused(f"the model was made of other polygons than {thing.name} has: sample and train again")


def write_scene(folder: RunFolder, scene: Path) -> None:
    """By the same import that the run has made."""
    steps = read_json(folder.run / "run.json").get("steps", {})
    words: List[str] = list(steps.get("import", {}).get("words", []))
    if words[:1] != ["import"] or "-o" not in words:
        raise Refused(f"{folder.run / 'run.json'} does not say how the character was imported")
    words[words.index("-o") + 1] = str(scene)
    quarn = preferences.paths().quarn
    try:
        answer = subprocess.run([quarn, *words, "--model-root", "../.."], cwd=folder.run, capture_output=True,
                                text=True, errors="replace")
    except OSError as error:
        raise Refused(f"{quarn or 'quarn'} cannot be started: {error.strerror}") from None
    if answer.returncode != 0:
        raise Refused("quarn import: " + " / ".join(answer.stderr.strip().splitlines()[-3:]))


def replace(part: Path, place: Path) -> None:
    """A folder takes another's place; at no time there is half of one."""
    old = place.with_name(place.name + ".old")
    shutil.rmtree(old, ignore_errors=True)
    if place.exists():
        if not (place / "metadata.json").is_file():
            raise Refused(f"{place} is no model, and is not replaced")
        os.rename(place, old)
    os.rename(part, place)
    shutil.rmtree(old, ignore_errors=True)
