# SPDX-License-Identifier: Apache-2.0
"""neuralwarp-farm cancel: takes back what was sent of a plan."""

import argparse
import os

from . import engines, plan
from .engines.base import locked


def add_arguments(parser: argparse.ArgumentParser) -> None:
    parser.add_argument("plan", metavar="PLAN", help="the plan's folder, or its plan.json")


def run(arguments: argparse.Namespace) -> int:
    """Results stay, and so does what running tasks have written: the next submit goes on with it."""
    os.umask(0o002)
    the_plan = plan.read(arguments.plan)
    with locked(the_plan):
        told = [text for text in (engine.cancel(the_plan) for engine in engines.ENGINES) if text]
    print("\n".join(told) or f"Nothing of {the_plan.name} is in a queue.")
    return 0
