# SPDX-License-Identifier: Apache-2.0
"""The tab neuralWarp in the sidebar of the 3D view: its head, and the part on use."""

import textwrap
from pathlib import Path
from typing import Any

import bpy

from . import live, module, muting

MARGIN, LETTER = 65.0, 6.4  # pixels of a region that no text has, with an icon; and of a letter, at a scale of 1


class SidebarPanel:
    bl_space_type = "VIEW_3D"
    bl_region_type = "UI"
    bl_category = "neuralWarp"


def write(layout: Any, text: str, icon: str = "NONE") -> None:
    """A text of any length: a panel breaks no lines by itself, and leaves out the middle of long ones."""
    region, scale = bpy.context.region, bpy.context.preferences.system.ui_scale
    letters = int((region.width / scale - MARGIN) / LETTER) if region else 0
    column = layout.column(align=True)
    for number, line in enumerate(textwrap.wrap(text, max(letters, 20))):
        column.label(text=line, icon=icon if number == 0 else "BLANK1" if icon != "NONE" else "NONE")


class UsePanel(SidebarPanel, bpy.types.Panel):
    bl_idname = "NEURALWARP_PT_use"
    bl_label = "Use"
    bl_order = 2

    def draw(self, context: Any) -> None:
        layout, thing = self.layout, context.object
        problem = module.problem()
        if problem:
            write(layout, problem, "ERROR")
            write(layout, "Another Blender can bake the model to a PC2 file, which this one plays:")
            layout.operator("neuralwarp.show_cache", icon="FILE_FOLDER")
        elif thing is None or thing.type != "MESH":
            layout.label(text="Choose a mesh")
        elif thing.neuralwarp.in_use:
            draw_use(layout, thing)
        else:
            layout.prop(thing.neuralwarp, "model")
            layout.operator("neuralwarp.use", icon="PLAY")
            layout.operator("neuralwarp.show_cache", icon="FILE_FOLDER")


def draw_use(layout: Any, thing: Any) -> None:
    settings = thing.neuralwarp
    layout.label(text=Path(settings.model).name, icon="MESH_DATA")
    layout.row(align=True).prop(settings, "show", expand=True)
    column = layout.column()
    column.active = settings.show == "NEURAL"
    column.prop(settings, "envelope", slider=True)
    column.prop_search(settings, "vertex_group", thing, "vertex_groups")
    draw_state(layout, thing)
    row = layout.row(align=True)
    row.operator("neuralwarp.stop", icon="SNAP_FACE")
    row.operator("neuralwarp.reload", icon="FILE_REFRESH")
    layout.label(text="Bake, for others")
    row = layout.row(align=True)
    for kind, text in (("PC2", "Mesh Cache"), ("SHAPE_KEYS", "Shape keys")):
        row.operator("neuralwarp.bake", text=text).kind = kind


def draw_state(layout: Any, thing: Any) -> None:
    """What the user should know of the frame that is shown."""
    problem = live.problem(thing)
    if problem:
        write(layout, problem, "ERROR")
    if thing.mode in live.NOT_DEFORMED:
        write(layout, f"Not deformed in {thing.mode.lower()} mode", "INFO")
    twice = muting.switched_on_again(thing)
    if twice and thing.neuralwarp.show != "ORIGINAL":
        write(layout, f"{', '.join(twice)}: on, although the model stands for it", "ERROR")
    state = live.state(thing)
    if problem or state is None:
        return
    if state.notes:
        write(layout, state.notes, "INFO")
    distance = state.distance()
    if distance:
        write(layout, f"{100 * distance:.0f} % outside of the trained ranges: the network guesses here", "ERROR")


CLASSES = (UsePanel,)

register, unregister = bpy.utils.register_classes_factory(CLASSES)
