# SPDX-License-Identifier: Apache-2.0
"""What a mesh object remembers of its sampling and training, in the .blend file: `Object.neuralwarp_sampling`."""

from typing import Any

import bpy

from .sampling import Settings

FIXED = {"options": set(), "override": {"LIBRARY_OVERRIDABLE"}}  # not animated
DEFAULT = Settings()


class SampleSettings(bpy.types.PropertyGroup):
    __annotations__ = {
        "samples": bpy.props.IntProperty(
            name="Poses", default=DEFAULT.samples, min=2, **FIXED, description="Drawn poses to train with"),
        "held_out": bpy.props.IntProperty(
            name="Held out", default=DEFAULT.held_out, min=3, **FIXED,
            description="Drawn poses that are never trained, to measure with"),
        "motion": bpy.props.StringProperty(
            name="Motion", **FIXED,
            description="An action that is never trained, to measure with in the place of drawn poses"),
        "activation_rate": bpy.props.FloatProperty(
            name="Active", default=DEFAULT.activation_rate, min=0.0, max=1.0, **FIXED,
            description="How likely each axis of a bone is turned in a pose"),
        "seed": bpy.props.IntProperty(
            name="Seed", default=DEFAULT.seed, min=0, **FIXED, description="Another one gives other poses"),
        "hold": bpy.props.IntProperty(
            name="Hold", default=DEFAULT.hold, min=1, **FIXED,
            description="Frames for which a pose is held, for cloth and soft bodies to come to rest"),
        "epochs": bpy.props.IntProperty(
            name="Epochs", default=0, min=0, **FIXED, description="Of the training; 0: as many as usual"),
        "with_report": bpy.props.BoolProperty(
            name="Report", default=True, **FIXED, description="Ends the training with a report that has pictures"),
        "is_sampled": bpy.props.BoolProperty(**FIXED),  # there may be a folder of it
    }


def settings_of(thing: Any) -> Settings:
    group = thing.neuralwarp_sampling
    return Settings(**{name: getattr(group, name) for name in Settings.__dataclass_fields__})


def register() -> None:
    bpy.utils.register_class(SampleSettings)
    pointer: Any = bpy.props.PointerProperty(type=SampleSettings, override={"LIBRARY_OVERRIDABLE"})
    bpy.types.Object.neuralwarp_sampling = pointer


def unregister() -> None:
    del bpy.types.Object.neuralwarp_sampling
    bpy.utils.unregister_class(SampleSettings)
