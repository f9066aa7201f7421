# SPDX-License-Identifier: Apache-2.0
"""Neural mesh deformation with NumPy in and out: the arithmetic is that of the plug-in, to the bit."""

from typing import TYPE_CHECKING, Any

from ._core import Deformer, Model, evaluate_characters, smooth, vertex_frames
from ._core import version as __version__
from .training import train

if TYPE_CHECKING:
    from ._scene import Plugs, Scene

__all__ = ["Deformer", "Model", "Plugs", "Scene", "__version__", "evaluate_characters", "smooth", "train",
           "vertex_frames"]


def __getattr__(name: str) -> Any:
    if name in ("Plugs", "Scene"):  # with the host, which asks for more of the machine: only when it is wanted
        from . import _scene

        return getattr(_scene, name)
    raise AttributeError(f"module {__name__!r} has no attribute {name!r}")
