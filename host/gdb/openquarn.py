# SPDX-License-Identifier: Apache-2.0
"""Shows HObject, HPlug and the slots of the host in GDB, from memory alone: nothing of the program is called.

source share/OpenQuarn/gdb/openquarn.py, or host/gdb/openquarn.py of a checkout. A host that was built without debug
information shows only that a handle is null or not.
"""

from __future__ import annotations

from collections.abc import Callable, Iterator

import gdb
import gdb.printing

# bits of Slot::state_, and what they say
STATES = {1: "dirty", 2: "dirty below", 4: "failed", 8: "told", 16: "told below"}
IMPLIED = {1: 2, 8: 16}  # whole: what is below is implied
NO_TYPES = "OpenQuarn has no debug information"


# --- libstdc++, as far as the host uses it ---


def text(string: gdb.Value) -> str:
    data = string["_M_dataplus"]["_M_p"]
    return data.string("utf-8", "replace", length=int(string["_M_string_length"]))


def shared(pointer: gdb.Value) -> gdb.Value:
    return pointer["_M_ptr"]


def unique(pointer: gdb.Value) -> gdb.Value:
    """The pointer that a unique_ptr is, whatever wraps it."""
    kept = pointer.type.strip_typedefs().template_argument(0)
    return pointer.address.reinterpret_cast(kept.pointer().pointer()).dereference()


def items(vector: gdb.Value) -> Iterator[gdb.Value]:
    at, end = (vector["_M_impl"][name] for name in ("_M_start", "_M_finish"))
    while at != end:
        yield at.dereference()
        at += 1


def engaged(optional: gdb.Value) -> gdb.Value | None:
    payload = optional["_M_payload"]
    return payload["_M_payload"]["_M_value"] if payload["_M_engaged"] else None


# --- the host ---


def word(enumerator: gdb.Value) -> str:
    """HFnNumericData::kDouble: double"""
    name = str(enumerator).rsplit("::", 1)[-1].removeprefix("k")
    return name[:1].lower() + name[1:]


def type_of(attribute: gdb.Value) -> str:
    kind = word(attribute["kind_"]).removesuffix("Attribute")
    shown = {"numeric": "number", "typed": "data", "matrix": "data"}.get(kind)
    return (word(attribute[shown]) if shown else kind) + ("[]" if attribute["array"] else "")


def path_of(slot: gdb.Value) -> str:
    """list[3].child"""
    above = path_of(slot["parent"].dereference()) if slot["parent"] else ""
    if slot["isElement"]:
        return f"{above}[{int(slot['index'])}]"
    name = text(shared(slot["field"]["attribute"])["name"])
    return f"{above}.{name}" if above else name


def state_of(slot: gdb.Value) -> str:
    bits = int(slot["state_"]["_M_i"])
    for whole, below in IMPLIED.items():
        if bits & whole:
            bits &= ~below
    words = [name for bit, name in STATES.items() if bits & bit]
    return ", ".join(words if bits & 1 else ["clean", *words])


def value_of(slot: gdb.Value) -> str:
    attribute = shared(slot["field"]["attribute"]).dereference()
    is_array = attribute["array"] and not slot["isElement"]
    if is_array or word(attribute["kind_"]) == "compoundAttribute":
        return ""
    if word(attribute["kind_"]) in ("numericAttribute", "enumAttribute"):
        return f" = {float(slot['number']):.17g}"
    data = shared(slot["data"])
    return f" = {object_text(data)}" if data else ""


def slot_text(slot: gdb.Value) -> str:
    owner = f"{text(slot['owner']['node']['name_'])}." if slot["owner"] else "(cut off) "
    kind = type_of(shared(slot["field"]["attribute"]).dereference())
    if slot["isElement"]:
        kind = kind.removesuffix("[]")
    return f"{owner}{path_of(slot)}{value_of(slot)} ({kind}, {state_of(slot)})"


def object_text(pointer: gdb.Value) -> str:
    """What a pointer on an Object stands for."""
    pointer = pointer.cast(pointer.type.target().strip_typedefs().pointer())
    try:
        there = pointer.cast(pointer.dynamic_type).dereference()
        name = there.type.name.rsplit("::", 1)[-1]
    except gdb.error:
        return f"an object at {pointer} ({NO_TYPES})"
    if name == "Node":
        gone = "" if there["alive_"]["_M_base"]["_M_i"] else "deleted "
        return f'{gone}node "{text(there["name_"])}" ({text(shared(there["type_"])["name"])})'
    if name == "Attribute":
        return f'attribute "{text(there["name"])}" ({type_of(there)})'
    if name == "StringData":
        return f'"{text(there["value"])}"'
    if name == "Plugin":
        return f'plug-in "{text(there["name"])}"'
    return name


# --- from a plug to its slot ---


def element(array: gdb.Value, index: int) -> gdb.Value | None:
    for block in items(unique(array["parts_"])["elements"]["blocks_"]):
        for entry in items(block):
            if int(entry["index"]) == index:
                return shared(entry["item"]).dereference()
    return None


def steps_of(plug: gdb.Value) -> list[tuple[gdb.Value, int | None]]:
    """The way of an HPlug::Impl from its node down: fields, and for an array the element, -1 for one not chosen."""
    steps: list[tuple[gdb.Value, int | None]] = []
    indices = [engaged(index) for index in items(plug["indices"])]
    field = plug["field"]
    is_last = True
    while field:
        index = None
        if shared(field["attribute"])["array"]:
            chosen = indices.pop()
            index = int(chosen) if chosen is not None else None if is_last else -1
        steps.insert(0, (field, index))
        field = field["parent"]
        is_last = False
    return steps


def slot_of(plug: gdb.Value) -> gdb.Value | None:
    """The slot of an HPlug::Impl in the scene, not in a context; none where it does not exist."""
    parts = shared(shared(plug["node"])["data_"])["slots"]
    slot: gdb.Value | None = None
    for field, index in steps_of(plug):
        if slot is not None:
            parts = unique(slot["parts_"])["children"]
        slot = shared(list(items(parts))[int(field["position"])]).dereference()
        if index is not None:
            slot = element(slot, index)
        if slot is None:
            return None
    return slot


def plug_text(plug: gdb.Value) -> str:
    node = shared(plug["node"])
    if not node["alive_"]["_M_base"]["_M_i"]:
        return "plug of a deleted node"
    slot = slot_of(plug)
    if slot is not None:
        return slot_text(slot)
    names = [
        text(shared(field["attribute"])["name"]) + ("" if index is None else f"[{index}]")
        for field, index in steps_of(plug)
    ]
    return f"{text(node['name_'])}.{'.'.join(names)} (not there)"


class Printer:
    """Prints what a function makes of a value."""

    def __init__(self, value: gdb.Value, show: Callable[[gdb.Value], str]) -> None:
        self.value = value
        self.show = show

    def to_string(self) -> str:
        try:
            return self.show(self.value)
        except (gdb.MemoryError, UnicodeError) as error:
            return f"not readable: {error}"


def handle(show: Callable[[gdb.Value], str], member: str) -> Callable[[gdb.Value], Printer]:
    """A printer for a handle whose member is a shared pointer on what `show` shows."""

    def of_handle(value: gdb.Value) -> str:
        pointer = shared(value[member])
        if not pointer:
            return "null"
        try:
            return show(pointer)
        except gdb.error:
            return f"at {pointer} ({NO_TYPES})"

    return lambda value: Printer(value, of_handle)


def make_printers() -> gdb.printing.RegexpCollectionPrettyPrinter:
    printers = gdb.printing.RegexpCollectionPrettyPrinter("OpenQuarn")
    printers.add_printer("HObject", "^HObject$", handle(object_text, "object_"))
    printers.add_printer("HPlug", "^HPlug$", handle(lambda plug: plug_text(plug.dereference()), "impl_"))
    printers.add_printer("Slot", "^OpenQuarn::Slot$", lambda value: Printer(value, slot_text))
    return printers


gdb.printing.register_pretty_printer(gdb.current_objfile(), make_printers(), replace=True)
