# SPDX-License-Identifier: Apache-2.0
"""What a mesh object in use remembers, in the .blend file: `Object.neuralwarp`."""

from typing import Any

import bpy

from . import live

FIXED = {"options": set(), "override": {"LIBRARY_OVERRIDABLE"}}  # not animated


class UseSettings(bpy.types.PropertyGroup):
    __annotations__ = {
        "in_use": bpy.props.BoolProperty(name="In use", **FIXED),
        "model": bpy.props.StringProperty(
            name="Model", subtype="DIR_PATH", **FIXED,
            description="The model, a folder NAME.nwrp: looked for where it is said to be, then beside the .blend "
                        "file, then in the folder of the add-on's preferences"),
        "show": bpy.props.EnumProperty(
            name="Show", **FIXED, update=live.on_show, items=(
                ("NEURAL", "Neural", "The armature's mesh, deformed by the network"),
                ("ORIGINAL", "Original", "The stack as the rigger built it"),
                ("ARMATURE", "Armature", "The armature's mesh alone"))),
        "envelope": bpy.props.FloatProperty(
            name="Envelope", default=1.0, min=0.0, max=1.0, override=FIXED["override"], update=live.on_setting,
            description="0: as the armature makes the mesh, 1: as the network does"),
        "vertex_group": bpy.props.StringProperty(
            name="Weights", **FIXED, update=live.on_setting,
            description="A vertex group whose weights multiply the envelope; without one all are 1"),
        "switches": bpy.props.StringProperty(**FIXED),  # how it was what is off: see muting.py
    }


def register() -> None:
    bpy.utils.register_class(UseSettings)
    pointer: Any = bpy.props.PointerProperty(type=UseSettings, override={"LIBRARY_OVERRIDABLE"})
    bpy.types.Object.neuralwarp = pointer


def unregister() -> None:
    del bpy.types.Object.neuralwarp
    bpy.utils.unregister_class(UseSettings)
