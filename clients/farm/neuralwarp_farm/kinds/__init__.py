# SPDX-License-Identifier: Apache-2.0
"""What is planned. A kind of work is a module with add_arguments(parser) and make_plan(arguments) -> Plan."""

from dataclasses import dataclass


@dataclass(frozen=True)
class Kind:
    name: str    # as in "neuralwarp-farm plan NAME"
    module: str  # in this folder; imported when it is asked for
    help: str


KINDS = (
    Kind("export", "frames", "training data of a scene, in parts that are merged"),
    Kind("bake", "frames", "a mesh plug as a point cache, in parts that are merged"),
    Kind("play", "frames", "a deformed mesh, a file a frame"),
    Kind("render", "frames", "pictures, one a frame"),
    Kind("targets", "targets", "targets by a program of yours, in parts that are merged"),
    Kind("train", "train", "models of many data sets, settings and seeds, and a table of them"),
)
