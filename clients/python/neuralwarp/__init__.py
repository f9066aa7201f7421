# SPDX-License-Identifier: Apache-2.0
"""Neural mesh deformation with NumPy in and out: the arithmetic is that of the plug-in, to the bit."""

from ._core import Deformer, Model, evaluate_characters, smooth, vertex_frames
from ._core import version as __version__

__all__ = ["Deformer", "Model", "__version__", "evaluate_characters", "smooth", "vertex_frames"]
