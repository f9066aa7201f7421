# SPDX-License-Identifier: Apache-2.0
"""The Blender add-on neuralWarp: samples a rig, trains a network on it, and deforms the mesh with it.

It computes no deformation of its own: the module `neuralwarp` does, with the bits of the plug-in. A file here has one
thing to do; `module.py` finds the module, and everything that has to be made known to Blender has `register()` and
`unregister()`, in the order of COMPONENTS.
"""

from . import (live, panel, preferences, properties, sample_operators, sample_panel, sample_settings, use_operators,
               watch)

bl_info = {
    "name": "neuralWarp",
    "author": "neuralWarp",
    "version": (0, 1, 0),
    "blender": (3, 4, 0),
    "location": "3D View > Sidebar > neuralWarp",
    "description": "Learns what a rig's modifiers and corrective shapes do, and does it live",
    "category": "Rigging",
}

COMPONENTS = (preferences, properties, live, use_operators, panel, sample_settings, sample_operators, sample_panel,
              watch)


def register() -> None:
    for component in COMPONENTS:
        component.register()


def unregister() -> None:
    for component in reversed(COMPONENTS):
        component.unregister()
