# SPDX-License-Identifier: Apache-2.0
"""The part of the sidebar on sampling and training."""

from __future__ import annotations

from typing import Any

import bpy

from . import jobs, watch
from .panel import SidebarPanel, write
from .refused import Refused
from .run_folder import RunFolder, folder_of


class SamplePanel(SidebarPanel, bpy.types.Panel):
    bl_idname = "NEURALWARP_PT_sample"
    bl_label = "Sample and train"
    bl_order = 1

    def draw(self, context: Any) -> None:
        layout, thing = self.layout, context.object
        if thing is None or thing.type != "MESH":
            layout.label(text="Choose a mesh")
            return
        settings = thing.neuralwarp_sampling
        column = layout.column()
        column.prop(settings, "samples")
        column.prop_search(settings, "motion", bpy.data, "actions")
        if not settings.motion:
            column.prop(settings, "held_out")
        row = column.row(align=True)
        row.prop(settings, "activation_rate", slider=True)
        row.prop(settings, "seed")
        if any(modifier.type in ("CLOTH", "SOFT_BODY") for modifier in thing.modifiers):
            column.prop(settings, "hold")
        layout.operator("neuralwarp.sample", icon="ARMATURE_DATA")
        if settings.is_sampled:
            draw_training(layout, thing, settings)


def draw_training(layout: Any, thing: Any, settings: Any) -> None:
    try:
        folder = folder_of(thing)
    except Refused as error:
        write(layout, str(error), "ERROR")
        return
    now = jobs.status(folder)
    if now.state == "runs":
        write(layout, now.said, "TIME")
        layout.operator("neuralwarp.cancel", icon="X")
        return
    if not folder.is_sampled:
        return
    row = layout.row(align=True)
    row.prop(settings, "epochs")
    row.prop(settings, "with_report")
    layout.operator("neuralwarp.train", text="Go on training" if now.state in ("cancelled", "stopped") else "Train",
                    icon="PLAY")
    draw_state(layout, folder, now)


def draw_state(layout: Any, folder: RunFolder, now: jobs.Status) -> None:
    if now.said:
        write(layout, now.said, "ERROR" if now.state == "failed" else "INFO")
    if now.state == "done":
        write(layout, watch.outcome(folder) or "trained", "CHECKMARK")
        layout.operator("neuralwarp.publish", icon="EXPORT")


register, unregister = bpy.utils.register_classes_factory((SamplePanel,))
