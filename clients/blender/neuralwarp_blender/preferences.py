# SPDX-License-Identifier: Apache-2.0
"""The add-on's settings: where models, `quarn` and a Python for trainings are."""

import os
import shutil
from typing import NamedTuple

import bpy


class Paths(NamedTuple):
    """Absolute paths; empty where there is nothing."""
    models: str
    quarn: str
    python: str  # empty: quarn looks for one


class Preferences(bpy.types.AddonPreferences):
    bl_idname = __package__

    __annotations__ = {
        "models_path": bpy.props.StringProperty(
            name="Models", subtype="DIR_PATH",
            description="Folder in which models are looked for that are not beside the .blend file"),
        "quarn_path": bpy.props.StringProperty(
            name="quarn", subtype="FILE_PATH", description="The program quarn; empty: the one that the system finds"),
        "python_path": bpy.props.StringProperty(
            name="Python", subtype="FILE_PATH",
            description="A Python with PyTorch, for trainings; empty: one that quarn finds. Blender's own is not used"),
    }

    def draw(self, context: bpy.types.Context) -> None:
        for name in self.__annotations__:
            self.layout.prop(self, name)


def paths() -> Paths:
    """As the user has set them, with defaults; also where the add-on runs without being listed in the preferences."""
    addon = bpy.context.preferences.addons.get(__package__)
    settings = addon.preferences if addon else None

    def setting(name: str) -> str:
        text = getattr(settings, name, "") if settings else ""
        return os.path.abspath(bpy.path.abspath(text)) if text else ""

    found = shutil.which("quarn")  # as the PATH has it, which may be relative
    return Paths(setting("models_path"), setting("quarn_path") or (os.path.abspath(found) if found else ""),
                 setting("python_path"))


register, unregister = bpy.utils.register_classes_factory((Preferences,))
