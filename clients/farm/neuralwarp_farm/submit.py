# SPDX-License-Identifier: Apache-2.0
"""neuralwarp-farm submit: gives what is left of a plan to an engine."""

import argparse
import os
from contextlib import nullcontext
from dataclasses import fields

from . import engines, plan, results
from .counts import megabytes, positive, whole
from .engines.base import Options, locked
from .errors import UsageError
from .plan import Plan, Task
from .results import State


def add_arguments(parser: argparse.ArgumentParser) -> None:
    parser.add_argument("plan", metavar="PLAN", help="the plan's folder, or its plan.json")
    parser.add_argument("--engine", default="slurm", metavar="NAME",
                        help="slurm (the default) sends; make, list and openjd write files for other programs")
    parser.add_argument("--partition", metavar="NAME", help="partition of the cluster")
    parser.add_argument("--cpus", type=positive, metavar="N", help="cores of a task, instead of the plan's")
    parser.add_argument("--memory", type=megabytes, dest="memory_mb", metavar="SIZE",
                        help="memory of a task in MiB, or with a unit as in 16G, instead of the plan's")
    parser.add_argument("--gpus", type=whole, metavar="N", help="GPUs of a task, instead of the plan's")
    parser.add_argument("--constraint", metavar="FEATURES", help="features that a node must have")
    parser.add_argument("--time", type=minutes, metavar="MINUTES",
                        help="time limit of a task: minutes, or [DAYS-]HOURS:MINUTES:SECONDS")
    parser.add_argument("--account", metavar="NAME", help="account that is charged")
    parser.add_argument("--dry-run", action="store_true", help="print what would be sent or written, and do neither")


def run(arguments: argparse.Namespace) -> int:
    os.umask(0o002)  # another of the group may go on with the plan
    the_plan = plan.read(arguments.plan)
    engine = engines.find(arguments.engine)
    options = Options(**{field.name: getattr(arguments, field.name) for field in fields(Options)})
    refuse_meaningless(engine, options)
    with nullcontext() if options.dry_run else locked(the_plan):
        tasks = left(the_plan)
        if tasks:
            print(engine.submit(the_plan, tasks, options))
        else:
            print(f"Nothing to send: all that is left of {the_plan.name} is being written."
                  if results_missing(the_plan) else f"Nothing to send: {the_plan.name} is complete.")
    return 0


def refuse_meaningless(engine: engines.Engine, options: Options) -> None:
    """An option that an engine cannot honour is an error, and no surprise in the night."""
    for field in fields(Options):
        said = field.name != "dry_run" and getattr(options, field.name) is not None
        if said and field.name not in engine.options:
            name = field.name.replace("_mb", "")
            raise UsageError(f"--{name} means nothing to the engine {engine.name}")


def left(the_plan: Plan) -> list[Task]:
    """What nobody has made and nobody is making, in the order of the plan."""
    return [task for task in the_plan.tasks if results.state_of(the_plan, task) in (State.BEGUN, State.MISSING)]


def results_missing(the_plan: Plan) -> bool:
    return any(results.state_of(the_plan, task) is not State.DONE for task in the_plan.tasks)


def minutes(text: str) -> float:
    """Minutes, M:S, H:M:S or D-H:M:S, as Slurm reads them."""
    days, dash, rest = text.partition("-") if "-" in text else ("0", "", text)
    numbers = rest.split(":")
    if not all(number.isdigit() for number in [days, *numbers]) or len(numbers) > 3 or (dash and len(numbers) != 3):
        raise argparse.ArgumentTypeError(f'"{text}" is neither minutes nor [DAYS-]HOURS:MINUTES:SECONDS')
    hours, whole, seconds = ([0] * (3 - len(numbers)) + [int(number) for number in numbers]
                             if len(numbers) != 1 else [0, int(numbers[0]), 0])
    if len(numbers) == 2:
        hours, whole, seconds = 0, int(numbers[0]), int(numbers[1])
    result = 1440 * int(days) + 60 * hours + whole + seconds / 60
    if result <= 0:
        raise argparse.ArgumentTypeError(f'"{text}" is no time at all')
    return result
