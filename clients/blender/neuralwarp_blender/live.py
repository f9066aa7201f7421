# SPDX-License-Identifier: Apache-2.0
"""Objects in use: whenever Blender has evaluated the scene, their meshes are deformed.

Handlers are called after a change of the frame, in playback and in renders, and after anything else that moved. A
render has a thread and an evaluated copy of its own. Objects are held by their names, since undo replaces what stands
behind a pointer.
"""

import threading
from typing import Any, Dict, List, Optional, Set, Tuple, Union

import bpy
from bpy.app.handlers import persistent

from . import model_folder, module, muting
from .deformation import Deformation
from .refused import Refused
from .stack import check_mesh_object, topology

NOT_DEFORMED = ("EDIT", "SCULPT")  # modes that work on the original mesh

State = Union[Deformation, str]  # or why there is none

_states: Dict[Tuple[int, str], Tuple[int, str, State]] = {}  # by thread and object; with round and model
_round = 0  # counted up where everything has to be made anew
_has_new_data = True  # after opening a file and undo: what is known of objects and meshes may not hold
_names: Optional[List[str]] = None  # of the objects in use; None: to be looked for
_objects = 0  # how many there were then
_busy: Set[int] = set()  # threads
_problems: Dict[str, str] = {}  # by object


# --- what operators, properties and the panel ask for ---

def use(thing: Any, model: str) -> None:
    """Puts a mesh object in use. Refused, module.Missing or an error of the module's: nothing has changed then."""
    check_mesh_object(thing)
    module.find()
    rig = model_folder.read_rig(model_folder.find(model))
    others = [other.name for other in bpy.data.objects
              if other.data == thing.data and other != thing and other.library is None]
    if rig.shape_keys and others:
        raise Refused(f"{thing.data.name} is the mesh of {others[0]}, too, whose shape keys would be off as well: "
                      "make it a single-user copy first")
    made = Deformation(rig, thing)
    made.joints.find_bones(find_armature(thing, rig))
    stop(thing)
    _states[_key(thing.name)] = (_round, model, made)
    thing.neuralwarp.model = model
    thing.neuralwarp.show = "NEURAL"
    thing.neuralwarp.in_use = True
    muting.mute(thing, rig)
    for scene in thing.users_scene:  # or the viewport would draw what a render is about to write
        scene.render.use_lock_interface = True
    look_again()
    refresh(thing)


def stop(thing: Any) -> None:
    """The object is as the rigger built it."""
    muting.restore(thing)
    thing.neuralwarp.in_use = False
    _problems.pop(thing.name, None)
    look_again()
    refresh(thing)


def forget() -> None:
    """Reads models anew at the next frame: their files may have changed."""
    global _round
    _round += 1
    look_again()


def refresh(thing: Any) -> None:
    """Has Blender evaluate the mesh again."""
    thing.update_tag(refresh={"OBJECT", "DATA"})


def problem(thing: Any) -> str:
    """Why the object is not deformed, or an empty text."""
    return _problems.get(thing.name, "") if thing.neuralwarp.in_use else ""


def state(thing: Any) -> Optional[Deformation]:
    """What is at work on the object, in this thread."""
    found = _states.get(_key(thing.name))
    return found[2] if found and isinstance(found[2], Deformation) else None


def find_armature(thing: Any, rig: model_folder.Rig) -> Any:
    """The armature that deforms the object; of several the first that has all bones of the rig."""
    armatures = [modifier.object for modifier in thing.modifiers if modifier.type == "ARMATURE" and modifier.object]
    if not armatures:
        raise Refused(f"{thing.name} has no Armature modifier with an armature")
    if len(armatures) == 1:
        return armatures[0]
    wanted = {bone for bone, _ in rig.bones}
    return next((armature for armature in armatures if wanted.issubset(armature.pose.bones.keys())), armatures[0])


def on_setting(settings: Any, _: Any) -> None:
    """A property has changed that the next evaluation looks at."""
    if settings.in_use:
        refresh(settings.id_data)


def on_show(settings: Any, _: Any) -> None:
    """A/B: what the model stands for is on for the original stack alone."""
    if not settings.in_use:
        return
    thing = settings.id_data
    if settings.show == "ORIGINAL":
        muting.restore(thing)
    else:
        _mute(thing)
    refresh(thing)


# --- evaluation ---

def look_again() -> None:
    """The objects in use may be others."""
    global _names
    _names = None


def things_in_use() -> List[Any]:
    """Objects of this file, not linked ones."""
    global _names, _objects
    if _names is not None and _objects == len(bpy.data.objects):
        things = [bpy.data.objects.get((name, None)) for name in _names]
        if all(thing is not None and thing.neuralwarp.in_use for thing in things):
            return things
    things = [thing for thing in bpy.data.objects
              if thing.type == "MESH" and thing.library is None and thing.neuralwarp.in_use]
    _names, _objects = [thing.name for thing in things], len(bpy.data.objects)
    for key in [key for key in _states if key[0] == threading.get_ident() and key[1] not in _names]:
        del _states[key]
    return things


def deform_all(depsgraph: Any) -> None:
    """Every object in use that this dependency graph has. Errors become the objects' problems."""
    thread = threading.get_ident()
    if thread in _busy:
        return
    _busy.add(thread)
    try:
        for thing in things_in_use():
            if thing.neuralwarp.show == "NEURAL" and thing.mode not in NOT_DEFORMED:
                _tell(thing.name, _deform(thing, depsgraph))
    finally:
        _busy.discard(thread)


def _deform(thing: Any, depsgraph: Any) -> str:
    """Why it was not done, or an empty text."""
    try:
        evaluated = thing.evaluated_get(depsgraph)
        if not evaluated.is_evaluated:  # of another scene, or hidden from this one
            return _problems.get(thing.name, "")
        working = _state(thing)
        if isinstance(working, str):
            return working
        armature = find_armature(thing, working.rig).evaluated_get(depsgraph)
        graph = (depsgraph.mode, depsgraph.scene.name, depsgraph.view_layer.name)
        working.deform(thing, evaluated, armature, graph)
        return ""
    except Exception as error:  # nothing may leave a handler: Blender would show it on the console alone
        return str(error) or repr(error)


def _state(thing: Any) -> State:
    """Of this thread; made where there is none, or none that fits. A failure is kept until something changes."""
    key, model = _key(thing.name), thing.neuralwarp.model
    made_in, made_of, found = _states.get(key, (-1, "", ""))
    if made_in == _round and made_of == model:
        return found
    try:
        found = Deformation(model_folder.read_rig(model_folder.find(model)), thing)
    except Exception as error:
        found = str(error) or repr(error)
    _states[key] = (_round, model, found)
    return found


def _mute(thing: Any) -> None:
    """Also where the model has gone: then it is told, and the stack stays as it is."""
    try:
        muting.mute(thing, model_folder.read_rig(model_folder.find(thing.neuralwarp.model)))
    except Refused as error:
        _tell(thing.name, str(error))


def _key(name: str) -> Tuple[int, str]:
    return threading.get_ident(), name


def _tell(name: str, text: str) -> None:
    if _problems.get(name, "") == text:
        return
    _problems[name] = text
    if not bpy.app.background and threading.current_thread() is threading.main_thread():
        for window in bpy.context.window_manager.windows:
            for area in window.screen.areas:
                if area.type == "VIEW_3D":
                    area.tag_redraw()


# --- handlers ---

@persistent
def on_frame(_: Any, depsgraph: Any) -> None:
    look_at_new_data()
    deform_all(depsgraph)


@persistent
def on_update(_: Any, depsgraph: Any) -> None:
    look_at_new_data()
    if depsgraph.id_type_updated("MESH"):
        check_meshes({update.id.original.name for update in depsgraph.updates
                      if isinstance(update.id, bpy.types.Mesh) and update.is_updated_geometry})
    deform_all(depsgraph)


@persistent
def on_file(*_: Any) -> None:
    """Another file: nothing that is known holds."""
    forget()
    _problems.clear()
    bpy.context.view_layer.update()  # the first evaluation of a file calls no handlers
    on_registered()


@persistent
def on_undo(*_: Any) -> None:
    global _has_new_data
    _has_new_data = True


def look_at_new_data() -> None:
    """What an object in use stands for is off, also where its file was saved without this add-on."""
    global _has_new_data
    if not _has_new_data:
        return
    _has_new_data = False
    look_again()
    for thing in things_in_use():
        if thing.neuralwarp.show != "ORIGINAL" and not thing.neuralwarp.switches:
            _mute(thing)
    check_meshes({thing.data.name for thing in things_in_use()})


@persistent
def on_render_end(*_: Any) -> None:
    """The thread of a render ends: what it made goes with it."""
    if threading.current_thread() is not threading.main_thread():
        for key in [key for key in _states if key[0] == threading.get_ident()]:
            del _states[key]


HANDLERS = (("frame_change_post", on_frame), ("depsgraph_update_post", on_update), ("load_post", on_file),
            ("undo_post", on_undo), ("redo_post", on_undo), ("render_complete", on_render_end),
            ("render_cancel", on_render_end))


def check_meshes(changed: Set[str]) -> None:
    """After an edit of these meshes: vertex groups are read again, and so is the model where polygons are others."""
    for thing in things_in_use():
        if thing.data.name in changed and thing.mode != "EDIT":
            working = state(thing)
            if working and topology(thing.data) == working.rig.topology:
                working.forget_mesh()
            else:
                _states.pop(_key(thing.name), None)


def register() -> None:
    on_undo()  # at the first handler, or by the timer where there is a window
    for name, handler in HANDLERS:
        getattr(bpy.app.handlers, name).append(handler)
    bpy.app.timers.register(on_registered, first_interval=0.0)  # until then Blender shows no data


def on_registered() -> None:
    on_undo()
    look_at_new_data()
    for thing in things_in_use():
        refresh(thing)


def unregister() -> None:
    """Objects in use are shown as the rigger built them, and are in use again when the add-on comes back."""
    for name, handler in HANDLERS:
        getattr(bpy.app.handlers, name).remove(handler)
    if bpy.app.timers.is_registered(on_registered):
        bpy.app.timers.unregister(on_registered)
    for thing in things_in_use():
        muting.restore(thing)
        refresh(thing)
    _states.clear()
    _problems.clear()
