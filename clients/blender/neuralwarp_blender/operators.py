# SPDX-License-Identifier: Apache-2.0
"""What the operators have in common."""

from typing import Any, Callable, Set

import bpy

from . import module
from .refused import Refused

FINISHED, CANCELLED = {"FINISHED"}, {"CANCELLED"}
ERRORS = (Refused, module.Missing, OSError, ValueError, RuntimeError)


class ForMesh(bpy.types.Operator):
    @classmethod
    def poll(cls, context: Any) -> bool:
        return context.object is not None and context.object.type == "MESH"


def refuse(operator: Any, error: Exception) -> Set[str]:
    """An error is one of the operator's reports (which raise a RuntimeError in a script)."""
    operator.report({"ERROR"}, str(error))
    return CANCELLED


def reported(operator: Any, work: Callable[[], Any]) -> Set[str]:
    """The operator's answer, whatever comes of the work."""
    try:
        work()
    except ERRORS as error:
        return refuse(operator, error)
    return FINISHED
