# SPDX-License-Identifier: Apache-2.0
"""What moves a mesh in Blender, and which part of it a model stands for.

A model takes the mesh as the armature makes it, and stands for what comes behind: modifiers behind the last Armature
modifier, and shape keys that have a driver. What stands before the last Armature modifier, and shape keys without a
driver, go on as they are. Modifiers that change the number of vertices are left out where they are the last ones.
"""

from __future__ import annotations

import hashlib
from dataclasses import dataclass
from typing import Any, Dict, Iterator, List, Sequence, Tuple

import bpy
import numpy as np
from numpy.typing import NDArray

from .refused import Refused

# modifiers whose shape depends on the frames before, or on the frame itself
MEMORY = {"CLOTH", "SOFT_BODY", "DYNAMIC_PAINT", "FLUID", "OCEAN", "WAVE", "BUILD", "EXPLODE", "PARTICLE_INSTANCE",
          "MESH_CACHE", "MESH_SEQUENCE_CACHE"}
HELD = {"CLOTH", "SOFT_BODY"}  # those that come to rest when a pose is held
HARMLESS = {"PARTICLE_SYSTEM", "COLLISION", "SURFACE"}  # move no vertex
SIMULATION_NODE = "GeometryNodeSimulationInput"  # of Blender 3.6 and later


@dataclass(frozen=True)
class Stack:
    """Names of an object's modifiers and shape keys by what becomes of them."""

    armature: str  # the object
    armature_modifiers: Tuple[str, ...]
    learned: Tuple[str, ...]  # modifiers, in their order
    shape_keys: Tuple[str, ...]  # with a driver: learned, too
    left_out: Tuple[str, ...]  # modifiers that change the number of vertices, at the end
    held: Tuple[str, ...]  # of the learned ones those that come to rest while a pose is held
    notes: Tuple[str, ...]  # sentences for the user

    @property
    def muted_modifiers(self) -> List[str]:
        """Those to switch off while a model is in use."""
        return [*self.learned, *self.left_out]


def topology(mesh: Any) -> str:
    """The polygons of a mesh (bpy.types.Mesh) as one hexadecimal SHA-256: of the vertices of all loops, and of how many
    loops each polygon has, both as little-endian 32-bit integers."""
    corners = np.empty(len(mesh.loops), dtype="<i4")
    mesh.loops.foreach_get("vertex_index", corners)
    counts = np.empty(len(mesh.polygons), dtype="<i4")
    mesh.polygons.foreach_get("loop_total", counts)
    return hashlib.sha256(corners.tobytes() + counts.tobytes()).hexdigest()


def evaluated_points(thing: Any) -> NDArray[np.float32]:
    """[vertices, 3], object space: the mesh with all that is switched on."""
    mesh = thing.evaluated_get(bpy.context.evaluated_depsgraph_get()).data
    flat = np.empty(3 * len(mesh.vertices), dtype=np.float32)
    mesh.vertices.foreach_get("co", flat)
    return flat.reshape(-1, 3)


class Switches:
    """Switches parts of an object's stack off and on, and in the end (`with`) puts all of it as it was."""

    def __init__(self, thing: Any) -> None:
        self.thing = thing
        self.modifiers: Dict[str, bool] = {}
        self.keys: Dict[str, bool] = {}

    def __enter__(self) -> "Switches":
        self.modifiers = {modifier.name: modifier.show_viewport for modifier in self.thing.modifiers}
        self.keys = {key.name: key.mute for key in key_blocks(self.thing)}
        return self

    def __exit__(self, *_: object) -> None:
        self.switch(self.shown(), ())

    def shown(self) -> List[str]:
        """The modifiers that were on."""
        return [name for name, is_on in self.modifiers.items() if is_on]

    def switch(self, modifiers: Sequence[str], muted_keys: Sequence[str]) -> None:
        """These modifiers are on, and no others; these keys are mute beside those that were."""
        for modifier in self.thing.modifiers:
            if modifier.show_viewport != (modifier.name in modifiers):
                modifier.show_viewport = modifier.name in modifiers
        for key in key_blocks(self.thing):
            is_mute = self.keys.get(key.name, False) or key.name in muted_keys
            if key.mute != is_mute:
                key.mute = is_mute

    def rest(self, stack: Stack) -> None:
        """What comes into the armature."""
        before = self._before(stack, stack.armature_modifiers[0])
        self.switch(before, stack.shape_keys)

    def skin(self, stack: Stack) -> None:
        """The mesh as the armature makes it."""
        last = stack.armature_modifiers[-1]
        self.switch([*self._before(stack, last), last], stack.shape_keys)

    def full(self, stack: Stack) -> None:
        """With all that is learned."""
        self.switch([name for name in self.shown() if name not in stack.left_out], ())

    def _before(self, stack: Stack, behind: str) -> List[str]:
        shown = self.shown()
        return shown[:shown.index(behind)]


def key_blocks(thing: Any) -> List[Any]:
    keys = thing.data.shape_keys
    return list(keys.key_blocks) if keys else []


def read_stack(thing: Any) -> Stack:
    """Looks at a mesh object and evaluates it some times; raises Refused. Nothing stays changed."""
    check_object(thing)
    shown = [modifier for modifier in thing.modifiers if modifier.show_viewport]
    skins = [modifier for modifier in shown if modifier.type == "ARMATURE"]
    armature = check_armatures(thing, skins)
    check_switches(thing)
    behind = shown[shown.index(skins[-1]) + 1:]
    kept = shown[:shown.index(skins[-1])]
    left_out = changing_vertices(thing, [modifier.name for modifier in kept], [modifier.name for modifier in behind])
    learned = [modifier for modifier in behind if modifier.name not in left_out and modifier.type not in HARMLESS]
    keys = tuple(driven_keys(thing))
    for name in check_time(thing, kept):
        raise Refused(f"{thing.name}: the modifier {name} has a memory, and stands before the armature, whose mesh a "
                      "model builds on: move it behind, or switch it off")
    held = check_time(thing, learned)
    if not learned and not keys:
        raise Refused(f"{thing.name} has no modifier behind its armature and no shape key with a driver: "
                      "there is nothing to learn")
    notes = [f"{thing.name}: the modifier {name} changes the number of vertices; it is off for sampling, and while the "
             "model is in use" for name in left_out]
    notes += drivers_not_run(thing, armature)
    notes += [f"{thing.name}: the modifier {modifier.name} is off in the viewport and on in renders; it is left out"
              for modifier in thing.modifiers if modifier.show_render and not modifier.show_viewport]
    return Stack(armature.name, tuple(modifier.name for modifier in skins),
                 tuple(modifier.name for modifier in learned), keys, tuple(left_out), tuple(held), tuple(notes))


def check_mesh_object(thing: Any) -> None:
    """Refused where it is no mesh object of this file, or its mesh is being edited."""
    if thing is None or thing.type != "MESH":
        raise Refused("the active object is " + ("none" if thing is None else f"{thing.name}, which is no mesh"))
    if thing.library is not None:
        raise Refused(f"{thing.name} is linked from {thing.library.filepath}: make a library override of object and "
                      "mesh first")
    if thing.mode == "EDIT":
        raise Refused(f"{thing.name} is in edit mode: leave it first")


def check_own_mesh(thing: Any) -> None:
    """Refused where the mesh of an object is linked: Blender would not write into its evaluated copies, and say
    nothing."""
    mesh = thing.data
    if mesh.library is not None:
        raise Refused(f"{mesh.name}, the mesh of {thing.name}, is linked from {mesh.library.filepath}: make a library "
                      "override of the mesh as well")


def check_object(thing: Any) -> None:
    check_mesh_object(thing)
    check_own_mesh(thing)
    if thing.show_only_shape_key:
        raise Refused(f"{thing.name} shows one shape key alone: switch this off first")
    if not thing.data.polygons:
        raise Refused(f"{thing.name} has no polygons")
    # hidden by the eye it is evaluated all the same
    if thing.name not in bpy.context.view_layer.objects or not (thing.visible_get() or thing.hide_get()):
        raise Refused(f"{thing.name} is disabled in the viewport, or in an excluded collection: Blender does not "
                      "evaluate it")


def check_armatures(thing: Any, skins: Sequence[Any]) -> Any:
    """The one armature object of these modifiers."""
    if not skins:
        if thing.parent is not None and thing.parent_type == "ARMATURE":
            raise Refused(f"{thing.name} follows {thing.parent.name} by its parent alone: give it an Armature modifier")
        raise Refused(f"{thing.name} has no Armature modifier that is on")
    objects = {modifier.object.name: modifier.object for modifier in skins if modifier.object is not None}
    if len(objects) != 1 or any(modifier.object is None for modifier in skins):
        names = ", ".join(f"{modifier.name} has {modifier.object.name if modifier.object else 'no object'}"
                          for modifier in skins)
        raise Refused(f"{thing.name} needs one armature, and of its modifiers {names}")
    armature = next(iter(objects.values()))
    if armature.library is not None:
        raise Refused(f"{armature.name} is linked from {armature.library.filepath}: make a library override of it "
                      "first")
    if armature.mode == "EDIT":
        raise Refused(f"{armature.name} is in edit mode: leave it first")
    if armature.data.pose_position == "REST":
        raise Refused(f"{armature.name} shows its rest position: switch to its pose position first")
    return armature


def check_switches(thing: Any) -> None:
    for curve in thing.animation_data.drivers if thing.animation_data else ():
        for modifier in thing.modifiers:
            if curve.data_path == f"{modifier.path_from_id()}.show_viewport" and not curve.mute:
                raise Refused(f"{thing.name}: a driver switches the modifier {modifier.name} on and off: remove it, or "
                              "mute it")


def changing_vertices(thing: Any, kept: Sequence[str], behind: Sequence[str]) -> List[str]:
    """Of the modifiers behind the armature those that change the number of vertices, and all behind them; found by
    evaluating. Refused where something to learn stands behind, or where one before the armature does it."""
    count = len(thing.data.vertices)
    with Switches(thing) as switches:
        for end in range(1, len(kept) + 1):
            switches.switch(kept[:end], ())
            found = len(evaluated_points(thing))
            if found != count:
                raise Refused(f"{thing.name}: the modifier {kept[end - 1]} makes {found} vertices of {count} before "
                              "the armature: apply it first")
        for end in range(1, len(behind) + 1):
            switches.switch([*kept, *behind[:end]], ())
            if len(evaluated_points(thing)) == count:
                continue
            moving = [name for name in behind[end:] if not is_decoration(thing, switches, kept, behind[:end], name)]
            if moving:
                raise Refused(f"{thing.name}: the modifier {behind[end - 1]} changes the number of vertices, and "
                              f"{moving[0]} stands behind it: move {moving[0]} before it, or apply {behind[end - 1]}")
            return list(behind[end - 1:])
    return []


def is_decoration(thing: Any, switches: Switches, kept: Sequence[str], before: Sequence[str], name: str) -> bool:
    """Whether a modifier behind one that changes the number of vertices changes it, too, or moves no vertex."""
    if thing.modifiers[name].type in HARMLESS or memory_of(thing.modifiers[name]):
        return thing.modifiers[name].type in HARMLESS
    switches.switch([*kept, *before], ())
    without = evaluated_points(thing)
    switches.switch([*kept, *before, name], ())
    points = evaluated_points(thing)
    return len(points) != len(without) or np.array_equal(points, without)


def check_time(thing: Any, modifiers: Sequence[Any]) -> List[str]:
    """The names of those that come to rest while a pose is held; refuses what depends on time otherwise."""
    held = []
    for modifier in modifiers:
        kind = memory_of(modifier)
        if kind in HELD:
            held.append(modifier.name)
        elif kind:
            raise Refused(f"{thing.name}: the modifier {modifier.name} depends on the frame, and not on the pose "
                          "alone: a model cannot learn it. Switch it off, or apply it")
    return held


def memory_of(modifier: Any) -> str:
    """The kind of memory that a modifier has, or another object that it follows: a modifier's type, or nothing."""
    if modifier.type in MEMORY:
        return str(modifier.type)
    nodes = getattr(modifier, "node_group", None)
    if nodes is not None and any(node.bl_idname == SIMULATION_NODE for node in nodes.nodes):
        return "NODES"
    leader = getattr(modifier, "target", None) or getattr(modifier, "object", None)
    if isinstance(leader, bpy.types.Object) and leader.type == "MESH":
        kinds = (other.type for other in leader.modifiers if other.show_viewport and other.type in MEMORY)
        return str(next(kinds, ""))
    return ""


def driven_keys(thing: Any) -> Iterator[str]:
    """Shape keys that a driver moves. One that Blender did not run is refused."""
    keys = thing.data.shape_keys
    if keys is None or keys.animation_data is None:
        return
    for curve in keys.animation_data.drivers:
        for key in keys.key_blocks:
            if curve.data_path == f'{key.path_from_id()}.value' and not key.mute and not curve.mute:
                if not curve.driver.is_valid:
                    raise Refused(f"{thing.name}: Blender does not run the driver of the shape key {key.name}"
                                  f"{why_not(curve.driver)}")
                yield key.name


def why_not(driver: Any) -> str:
    """Of a driver that Blender has given up: a file that may not run scripts still runs simple expressions."""
    if bpy.app.autoexec_fail and driver.type == "SCRIPTED" and not driver.is_simple_expression:
        return f": {driver.expression} is Python, and the file may not run scripts (Auto Run Python Scripts)"
    return f": {driver.expression} is not valid"


def drivers_not_run(thing: Any, armature: Any) -> List[str]:
    """A sentence for each other driver of mesh and armature that is not run."""
    return [f"{owner.name}: Blender does not run the driver of {curve.data_path}{why_not(curve.driver)}"
            for owner in (thing, armature, armature.data) if owner.animation_data
            for curve in owner.animation_data.drivers if not curve.mute and not curve.driver.is_valid]
