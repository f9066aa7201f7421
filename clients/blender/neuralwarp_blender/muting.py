# SPDX-License-Identifier: Apache-2.0
"""Switches off what a model stands for while it is in use, and on again. How it was is kept with the object, so that a
file that was saved in between finds its way back."""

import json
from typing import Any, List

from .model_folder import Rig
from .stack import key_blocks


def mute(thing: Any, rig: Rig) -> None:
    """Modifiers and shape keys of the rig are off from now on. Done again, it changes nothing."""
    settings = thing.neuralwarp
    modifiers = [modifier for modifier in thing.modifiers if modifier.name in rig.modifiers]
    keys = [key for key in key_blocks(thing) if key.name in rig.shape_keys]
    if not settings.switches:
        settings.switches = json.dumps({
            "modifiers": {modifier.name: [modifier.show_viewport, modifier.show_render] for modifier in modifiers},
            "shapeKeys": {key.name: key.mute for key in keys}})
    for modifier in modifiers:
        modifier.show_viewport = modifier.show_render = False
    for key in keys:
        key.mute = True


def restore(thing: Any) -> None:
    """All of it as it was before mute()."""
    settings = thing.neuralwarp
    if not settings.switches:
        return
    before = json.loads(settings.switches)
    for modifier in thing.modifiers:
        if modifier.name in before["modifiers"]:
            modifier.show_viewport, modifier.show_render = before["modifiers"][modifier.name]
    for key in key_blocks(thing):
        if key.name in before["shapeKeys"]:
            key.mute = before["shapeKeys"][key.name]
    settings.switches = ""


def switched_on_again(thing: Any) -> List[str]:
    """What somebody has switched on although the model stands for it: it would come on top."""
    if not thing.neuralwarp.switches:
        return []
    before = json.loads(thing.neuralwarp.switches)
    return [modifier.name for modifier in thing.modifiers
            if modifier.name in before["modifiers"] and modifier.show_viewport] + \
        [key.name for key in key_blocks(thing) if key.name in before["shapeKeys"] and not key.mute]
