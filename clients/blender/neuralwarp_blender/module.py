# SPDX-License-Identifier: Apache-2.0
"""The module `neuralwarp`: Python's own where it is installed, else the one that the add-on brings along in lib/."""

import importlib
import platform
import sys
import sysconfig
from pathlib import Path
from types import ModuleType
from typing import Optional

LIBRARY = Path(__file__).resolve().parent / "lib"

_module: Optional[ModuleType] = None
_problem = ""


class Missing(RuntimeError):
    """The module does not load. The text says why, and which Python it is for."""


def find() -> ModuleType:
    """The module; Missing where it does not load. Looks once: forget() has it look again."""
    global _module, _problem
    if _module is None and not _problem:
        try:
            _module = _load()
        except Exception as error:  # also what a foreign library's loading throws
            _problem = explanation(error)
    if _module is None:
        raise Missing(_problem)
    return _module


def problem() -> str:
    """Why the module does not load, or an empty text."""
    try:
        find()
    except Missing as error:
        return str(error)
    return ""


def forget() -> None:
    global _module, _problem
    _module, _problem = None, ""


def explanation(error: Exception) -> str:
    """A sentence for what failed: which Python the module at hand is for, and which one this is."""
    here = f"CPython {platform.python_version()} on {sysconfig.get_platform()}"
    tags = sorted({path.name.split(".")[1] for path in LIBRARY.glob("neuralwarp/_core.*.so")})
    if not tags:
        return f"The module neuralwarp is not installed for this Python ({here}): {error}"
    if sysconfig.get_config_var("SOABI") not in tags:
        return f"The module neuralwarp of this add-on is for {', '.join(tags)}; this Blender has {here}"
    return f"The module neuralwarp does not load: {error}"


def _load() -> ModuleType:
    try:
        return importlib.import_module("neuralwarp")
    except ModuleNotFoundError as error:
        if error.name != "neuralwarp" or not LIBRARY.is_dir():
            raise
    sys.path.append(str(LIBRARY))
    try:
        return importlib.import_module("neuralwarp")
    except Exception:
        sys.path.remove(str(LIBRARY))
        raise
