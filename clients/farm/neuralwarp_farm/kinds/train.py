# SPDX-License-Identifier: Apache-2.0
"""Many trainings: a model each, and a table of all in the end."""

import argparse
import os
from pathlib import Path

from .. import facts, sums
from ..plan import Plan, Resources, Result, SourceFile, Task
from . import common
from .train_list import Training, read_list
from .training_table import JSON, TEXT

# of a data set: what is small, and another when the large ones are, as it says how far targets are from the skin
LOOKED_AT = ("dataset.json", "controls.npy", "frames.npy")


def add_arguments(parser: argparse.ArgumentParser) -> None:
    parser.add_argument("list", metavar="LIST.json", type=Path,
                        help="what to train: an array of objects with name, dataset, arguments, seeds and each")
    common.add_folder(parser)
    parser.add_argument("--trainer", metavar="PATH", help="if not given: $NEURALWARP_TRAINER, a checkout's, the PATH's")
    parser.add_argument("--minutes", type=common.above_zero, metavar="M",
                        help="how long a training is expected to take; if not given, nothing is said of it")
    common.add_resources(parser)
    common.add_environment(parser)
    parser.set_defaults(cpus=1)


def make_plan(arguments: argparse.Namespace) -> Plan:
    quarn = facts.find_quarn(arguments.quarn)
    build = facts.build_of(quarn)
    trainings = read_list(arguments.list)
    resources = Resources(arguments.cpus, arguments.memory_mb or Resources.memory_mb, arguments.gpus,
                          arguments.minutes or 0)
    models = [Task(training.name, words_of(training), (), Result("model", f"models/{training.name}.nwrp"), resources)
              for training in trainings]
    table = Task("merge", ("{python}", "-m", "neuralwarp_farm", "table", "{folder}", "--write"),
                 tuple(model.id for model in models), Result("frames", ".", (JSON, TEXT)), common.MERGING)
    return Plan(common.folder_of(arguments), "train", common.name_of(arguments, f"{arguments.list.stem}.train"),
                build.version, build.build, {"quarn": quarn, "train": facts.find_trainer(arguments.trainer)},
                files_of(trainings), None, None, None, common.environment_of(arguments), (*models, table))


def words_of(training: Training) -> tuple[str, ...]:
    """A place that another attempt finds again: it goes on from the checkpoint there, if that is of the same training.
    What the list says comes last."""
    model = f"models/{training.name}"
    return ("{train}", "train", str(training.dataset), "-o", f"{model}.nwrp", "--report", f"{model}.report",
            "--resume-if-fits", "--threads", "{threads}", "--quarn", "{quarn}", *training.words)


def files_of(trainings: list[Training]) -> tuple[SourceFile, ...]:
    folders = {str(training.dataset) for training in trainings}
    folders |= {word for training in trainings for word in training.words if os.path.isabs(word)}
    return tuple(sums.source_file(os.path.join(folder, name)) for folder in sorted(folders) for name in LOOKED_AT
                 if os.path.isfile(os.path.join(folder, name)))
