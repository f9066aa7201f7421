# SPDX-License-Identifier: Apache-2.0
"""Neural mesh deformation with NumPy in and out: the arithmetic is that of the plug-in, to the bit."""

import os
from typing import TYPE_CHECKING, Any

# a network runs on as many threads as its trainer found right; it counts at the load of each model (docs/installed.md)
os.environ.setdefault("ORT_LOAD_CONFIG_FROM_MODEL", "1")

from ._core import Deformer, Model, evaluate_characters, smooth, vertex_frames  # noqa: E402
from ._core import version as __version__  # noqa: E402
from .training import train  # noqa: E402

if TYPE_CHECKING:
    from ._scene import Plugs, Scene

__all__ = ["Deformer", "Model", "Plugs", "Scene", "__version__", "evaluate_characters", "smooth", "train",
           "vertex_frames"]


def __getattr__(name: str) -> Any:
    if name in ("Plugs", "Scene"):  # with the host, which asks for more of the machine: only when it is wanted
        from . import _scene

        return getattr(_scene, name)
    raise AttributeError(f"module {__name__!r} has no attribute {name!r}")
