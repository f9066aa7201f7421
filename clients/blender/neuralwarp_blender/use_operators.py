# SPDX-License-Identifier: Apache-2.0
"""The operators of use: in the sidebar, and the same without a window. What is wrong is reported, and nothing has
changed then."""

from pathlib import Path
from typing import Any, Set

import bpy

from . import bake, live, module
from .operators import FINISHED, ForMesh, reported
from .refused import Refused

UNDO = {"REGISTER", "UNDO"}


class Use(ForMesh):
    bl_idname = "neuralwarp.use"
    bl_label = "Use"
    bl_description = "Deforms the active mesh with a model, in the viewport and in renders"
    bl_options = UNDO
    __annotations__ = {
        "model": bpy.props.StringProperty(
            name="Model", description="A folder NAME.nwrp; empty: the one that the object has been used with"),
    }

    def execute(self, context: Any) -> Set[str]:
        thing = context.object
        return reported(self, lambda: live.use(thing, self.model or thing.neuralwarp.model))


class Stop(ForMesh):
    bl_idname = "neuralwarp.stop"
    bl_label = "Stop"
    bl_description = "Shows the active mesh as the rigger built it"
    bl_options = UNDO

    def execute(self, context: Any) -> Set[str]:
        return reported(self, lambda: live.stop(context.object))


class Reload(bpy.types.Operator):
    bl_idname = "neuralwarp.reload"
    bl_label = "Reload"
    bl_description = "Reads the models of all objects in use again"

    def execute(self, context: Any) -> Set[str]:
        module.forget()
        live.forget()
        for thing in live.things_in_use():
            live.refresh(thing)
        return FINISHED


class Bake(ForMesh):
    bl_idname = "neuralwarp.bake"
    bl_label = "Bake"
    bl_description = "Writes down what the model does, for somebody without this add-on, and takes the model out of use"
    bl_options = UNDO
    __annotations__ = {
        "kind": bpy.props.EnumProperty(name="To", items=(
            ("PC2", "Mesh Cache", "A PC2 file, which a Mesh Cache modifier plays"),
            ("SHAPE_KEYS", "Shape keys", "A copy of the object with a shape key a frame"))),
        "filepath": bpy.props.StringProperty(
            name="File", subtype="FILE_PATH", description="Of the PC2; empty: beside the .blend, by the object's name"),
        "first": bpy.props.IntProperty(name="First", description="The first frame; 0 to 0: those of the scene"),
        "last": bpy.props.IntProperty(name="Last"),
    }

    def execute(self, context: Any) -> Set[str]:
        return reported(self, lambda: self._bake(context.object, context.scene))

    def _bake(self, thing: Any, scene: Any) -> None:
        has_frames = self.first != 0 or self.last != 0
        first, last = (self.first, self.last) if has_frames else (scene.frame_start, scene.frame_end)
        if self.kind == "SHAPE_KEYS":
            made = bake.to_shape_keys(thing, first, last)
            self.report({"INFO"}, f"{made.name} has {last - first + 1} frames as shape keys; {thing.name} stays in use")
            return
        bake.to_mesh_cache(thing, self._path(thing), first, last)

    def _path(self, thing: Any) -> Path:
        if not self.filepath and not bpy.data.filepath:
            raise Refused("the file was never saved: save it, or say where the PC2 is to be")
        return Path(bpy.path.abspath(self.filepath or f"//{bpy.path.clean_name(thing.name)}.pc2"))


class ShowCache(ForMesh):
    bl_idname = "neuralwarp.show_cache"
    bl_label = "Show a PC2"
    bl_description = "Has a Mesh Cache modifier play a PC2 file that was baked elsewhere: it needs no module"
    bl_options = UNDO
    __annotations__ = {
        "filepath": bpy.props.StringProperty(name="File", subtype="FILE_PATH"),
        "filter_glob": bpy.props.StringProperty(default="*.pc2", options={"HIDDEN"}),
        "first": bpy.props.IntProperty(name="First", default=1, description="The frame that its first one is for"),
    }

    def invoke(self, context: Any, event: Any) -> Set[str]:
        context.window_manager.fileselect_add(self)
        return {"RUNNING_MODAL"}

    def execute(self, context: Any) -> Set[str]:
        path = Path(bpy.path.abspath(self.filepath))
        return reported(self, lambda: bake.show_cache(context.object, path, self.first))


CLASSES = (Use, Stop, Reload, Bake, ShowCache)

register, unregister = bpy.utils.register_classes_factory(CLASSES)
