# SPDX-License-Identifier: Apache-2.0
"""Looks every other second at the trainings that run: the sidebar shows how far they are, one that is done is
published, and one that failed says so in a window. Those of a file that is opened are found again."""

from __future__ import annotations

from pathlib import Path
from typing import Any, Dict, Iterator, Optional, Tuple

import bpy
from bpy.app.handlers import persistent

from . import jobs
from .publish import publish
from .refused import Refused
from .run_folder import RunFolder, folder_of

SECONDS = 2.0

_running: Dict[str, Path] = {}  # objects whose training was seen to run, with its folder
_outcomes: Dict[Path, str] = {}  # by the folder of a sampling: what became of what was done by itself


def outcome(folder: RunFolder) -> str:
    """A sentence on a model that was published, or could not be; empty where there is none."""
    return _outcomes.get(folder.path, "")


def set_outcome(folder: RunFolder, text: str) -> None:
    _outcomes[folder.path] = text


def begin() -> None:
    if not bpy.app.timers.is_registered(tick):
        bpy.app.timers.register(tick, first_interval=0.0, persistent=True)


def sampled() -> Iterator[Tuple[Any, RunFolder]]:
    for thing in bpy.data.objects:
        if thing.type == "MESH" and thing.neuralwarp_sampling.is_sampled:
            try:
                yield thing, folder_of(thing)
            except Refused:
                continue


def tick() -> Optional[float]:
    """A look; its return value is when to look again, if at all."""
    running = {}
    for thing, folder in list(sampled()):
        now = jobs.status(folder)
        if now.state == "runs":
            running[thing.name] = folder.path
        elif _running.get(thing.name) == folder.path:
            finish(thing, folder, now)
    _running.clear()
    _running.update(running)
    redraw()
    return SECONDS if running else None


def finish(thing: Any, folder: RunFolder, now: jobs.Status) -> None:
    if now.state == "done":
        try:
            publish_into(thing)
        except Refused as error:
            set_outcome(folder, str(error))
            popup(f"{thing.name}: {error}")
    elif now.state == "failed":
        popup(f"the training of {thing.name} failed: {now.said}")


def publish_into(thing: Any) -> Path:
    """Publishes, says so, and has the object know its model."""
    place = publish(thing)
    set_outcome(folder_of(thing), f"published as {place.name}")
    if hasattr(thing, "neuralwarp"):
        thing.neuralwarp.model = bpy.path.relpath(str(place)) if bpy.data.filepath else str(place)
        if thing.neuralwarp.in_use:
            bpy.ops.neuralwarp.reload()
    return place


def popup(text: str) -> None:
    """In the first window; without one the sidebar says it alone."""
    manager = bpy.context.window_manager
    for window in manager.windows[:1]:
        with bpy.context.temp_override(window=window):
            manager.popup_menu(lambda menu, _: menu.layout.label(text=text), title="neuralWarp", icon="ERROR")


def redraw() -> None:
    for window in bpy.context.window_manager.windows:
        for area in window.screen.areas:
            if area.type == "VIEW_3D":
                area.tag_redraw()


@persistent
def on_load(_: object) -> None:
    _running.clear()
    begin()


def register() -> None:
    bpy.app.handlers.load_post.append(on_load)
    begin()


def unregister() -> None:
    bpy.app.handlers.load_post.remove(on_load)
    if bpy.app.timers.is_registered(tick):
        bpy.app.timers.unregister(tick)
