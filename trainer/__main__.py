# SPDX-License-Identifier: Apache-2.0
"""The command line: python3 -m trainer COMMAND ..."""

import argparse
import json
import os
import signal
import sys
from functools import partial
from pathlib import Path
from types import FrameType
from typing import TYPE_CHECKING, Any, Callable, NoReturn, Optional, Union

from . import __version__
from .errors import (DONE, FAILED, INTERRUPTED, LOCKED, TERMINATED, USAGE, LockedByAnother, Terminated, TrainerError,
                     UsageError)

if TYPE_CHECKING:  # what needs NumPy is imported by the commands, behind what sets its threads
    from .folders import Work
    from .settings import Settings

# Debian's packages by module, for whoever has to install them
PACKAGES = {name: f"python3-{name}" for name in ("numpy", "scipy", "torch", "onnx", "tqdm", "matplotlib")}


class Parser(argparse.ArgumentParser):
    def error(self, message: str) -> NoReturn:
        raise UsageError(f"{message} (see {self.prog} --help)")


def parser() -> Parser:
    main = Parser(prog="trainer", description="Trains models for the neuralWarp deformer.", allow_abbrev=False,
                  formatter_class=argparse.RawDescriptionHelpFormatter, epilog=settings_text())
    main.add_argument("--version", action="version", version=f"trainer {__version__}")
    commands = main.add_subparsers(dest="command", required=True, metavar="COMMAND")
    add_train(commands)

    evaluate = commands.add_parser("evaluate", help="errors of a model on a data set", allow_abbrev=False)
    add_dataset(evaluate)
    evaluate.add_argument("model", metavar="MODEL.nwrp")
    add_quarn(evaluate)
    evaluate.add_argument("--json", action="store_true", help="write the errors as JSON")
    evaluate.add_argument("--certify", action="store_true", help="add the errors to the model's certificate")
    evaluate.add_argument("--report", metavar="FOLDER", help="write the errors there as well, and those of every frame "
                          "and vertex as .npy")

    zero = commands.add_parser("zero", help="write a model that outputs zeros", allow_abbrev=False)
    add_dataset(zero)
    zero.add_argument("-o", "--output", required=True, metavar="MODEL.nwrp")
    zero.add_argument("--quiet", action="store_true")

    info = commands.add_parser("info", help="check a data set and say what is in it", allow_abbrev=False)
    add_dataset(info)
    info.add_argument("--json", action="store_true", help="write dataset.json without its long lists, and the digest")
    return main


def add_dataset(command: argparse.ArgumentParser) -> None:
    command.add_argument("dataset", metavar="DATASET", help="folder that 'quarn export' wrote")


def add_quarn(command: argparse.ArgumentParser) -> None:
    command.add_argument("--quarn", metavar="PATH", help="the quarn to run the model with, or 'none'; if not given: "
                         "$QUARN, build/release/quarn/quarn, the PATH")


def add_train(commands: "argparse._SubParsersAction[Parser]") -> None:
    train = commands.add_parser("train", help="train a model, or several", allow_abbrev=False)
    train.add_argument("dataset", metavar="DATASET", help="folder that 'quarn export' wrote, or one of such folders: "
                       "each becomes a model")
    train.add_argument("-o", "--output", metavar="MODEL.nwrp",
                       help="model directory; if not given: models/NAME.nwrp with the data set's outputModelName. Of "
                       "several data sets the folder of these, models if not given")
    train.add_argument("--validation-set", metavar="DATASET", help="validate and test on its rows, half of them each, "
                       "and train on all rows of the other; of the same mesh. Of several data sets a folder with one "
                       "of the same name for each")
    train.add_argument("--seed", type=int, default=1, help="of everything that is drawn at random (default 1)")
    train.add_argument("--threads", type=int, default=1, help="of the arithmetic; the model depends on it (default 1)")
    train.add_argument("--report", metavar="FOLDER", help="if not given: NAME.report beside the model; of several "
                       "the folder of these")
    add_quarn(train)
    add_going_on(train)
    train.add_argument("--quiet", action="store_true", help="only errors")
    train.add_argument("--json", action="store_true", help="write the report to standard output as well")
    train.add_argument("--progress", metavar="FILE",
                       help="keep this file at what is done, as JSON, for programs that look on")
    add_settings(train.add_argument_group("settings", SETTINGS_RULE))


def add_going_on(train: argparse.ArgumentParser) -> None:
    goes_on = train.add_mutually_exclusive_group()
    goes_on.add_argument("--resume", dest="resume", action="store_const", const="resume", default="anew",
                         help="go on from NAME.checkpoint beside the model, which an interrupted training has left")
    goes_on.add_argument("--resume-if-fits", dest="resume", action="store_const", const="if fits",
                         help="the same, and begin anew where that is of another training or damaged")
    train.add_argument("--checkpoint-every", type=float, default=60, metavar="SECONDS",
                       help="how often it is written (default 60), if that takes at most 2 %% of the time")
    train.add_argument("--warm-start", metavar="MODEL.nwrp",
                       help="begin as this model, which was trained on fewer poses, say, with the same layers")
    train.add_argument("--device", default="cpu", metavar="DEVICE",
                       help="cpu (default), cuda, or auto: cuda where there is one. The model depends on it")


SETTINGS_RULE = ("Each takes the place of the data set's, which come from the node's train attributes; what the data "
                 "set lacks has the default.")
# flags of the settings, in the order of the node's attributes
SETTING_FLAGS = {
    "batchSize": "--batch-size", "epochs": "--epochs", "learningRate": "--learning-rate",
    "validationRatio": "--validation-ratio", "hiddenLayerCount": "--hidden-layers", "neuronsPerLayer": "--neurons",
    "activationFunction": "--activation", "dropoutRatio": "--dropout", "principalShapesLimit": "--principal-limit",
    "principalShapesAccuracy": "--principal-accuracy", "patience": "--patience",
    "guard": "--guard", "guardWidth": "--guard-width", "principalShapesBudget": "--basis-budget",
}


def add_settings(group: argparse._ArgumentGroup) -> None:
    from .settings import KINDS, described

    for name, flag in SETTING_FLAGS.items():
        group.add_argument(flag, dest=name, type=KINDS[name], metavar=name, help=described(name))
    kind = group.add_mutually_exclusive_group()
    kind.add_argument("--principal-shapes", dest="principalShapesEnabled", action="store_true", default=None,
                      help=described("principalShapesEnabled"))
    kind.add_argument("--direct", dest="principalShapesEnabled", action="store_false", help="learn the deltas")
    group.add_argument("--linear-path", dest="linearPath", action=argparse.BooleanOptionalAction,
                       help=described("linearPath"))
    group.add_argument("--local-neurons", dest="localNeurons", action=argparse.BooleanOptionalAction,
                       help=described("localNeurons"))
    group.add_argument("--half-shapes", dest="principalShapesHalf", action="store_true", default=None,
                       help=described("principalShapesHalf"))
    group.add_argument("--preload", dest="preloadData", action=argparse.BooleanOptionalAction,
                       help=described("preloadData"))


def settings_text() -> str:
    """The settings of a training, as the help of the whole program shows them."""
    from .settings import described

    flags = {**SETTING_FLAGS, "principalShapesEnabled": "--principal-shapes",
             "linearPath": "--linear-path", "localNeurons": "--local-neurons",
             "principalShapesHalf": "--half-shapes", "preloadData": "--preload"}
    return "\n".join(["settings of train, for everything else see 'trainer train --help':",
                      *(f"  {flag:22} {described(name)}" for name, flag in flags.items()), "", SETTINGS_RULE])


# --- the commands ---

def command_train(options: argparse.Namespace) -> int:
    if not 0 <= options.seed < 2**32:
        raise TrainerError(f"--seed is {options.seed}, not a whole number from 0 to {2**32 - 1}")
    if not 0 <= options.checkpoint_every <= 1e6:
        raise TrainerError(f"--checkpoint-every is {options.checkpoint_every:g}, not a number of seconds from 0 to 1e6")
    pin_threads(options.threads)
    from . import folders

    below = folders.sets_below(options.dataset)
    if below:
        return train_all(options, folders.works_of(options.dataset, below))
    result = train_one(options, options.dataset, options.validation_set,
                       lambda settings: output_path(options, settings), options.report)
    if options.json:
        print(json.dumps(result, indent=1))
    return INTERRUPTED if result["interrupted"] else DONE


def train_one(options: argparse.Namespace, folder: Union[str, Path], validation_set: Union[str, Path, None],
              model_of: Callable[["Settings"], Path], wanted_report: Optional[str]) -> dict[str, Any]:
    """Trains the model of a data set. Returns its report."""
    from . import evaluator, limits, pipeline
    from .dataset import load_dataset
    from .device import Device
    from .guard import check_guard
    from .measure import advice, as_lines
    from .settings import KINDS, override
    from .split import sentence

    say = speaker(options)
    quarn, device = evaluator.find_quarn(options.quarn), Device(options.device)
    dataset = load_dataset(folder)
    validation = load_dataset(validation_set) if validation_set else None
    changes = {name: getattr(options, name) for name in KINDS if getattr(options, name, None) is not None}
    settings = override(dataset.settings, changes, lambda name: SETTING_FLAGS.get(name, name))
    check_guard(settings, changes)
    model = model_of(settings)
    first = Path(options.warm_start) if options.warm_start else None
    if first and first.resolve() == model.resolve():
        raise TrainerError(f"--warm-start {first} is the model that is to be written: give that another name with -o")
    report = Path(wanted_report) if wanted_report else model.with_suffix(".report")
    result = pipeline.train(pipeline.Job(dataset, settings, options.seed, options.threads, model, report, quarn, say,
                                         not options.quiet, validation, options.resume,
                                         options.checkpoint_every, device, first,
                                         Path(options.progress) if options.progress else None))
    for line in [*as_lines(result["errors"]), sentence(result["split"]),
                 *limits.sentences(result), *advice(result["errors"])]:
        say(line)
    say(f"wrote {model} and {report}")
    return result


def train_all(options: argparse.Namespace, works: "list[Work]") -> int:
    """Trains a model of each; what fails does not keep the others from it, and is an error at the end."""
    from . import evaluator, folders

    evaluator.find_quarn(options.quarn)  # where there is none of that name, it is missing for all
    place = Path(options.output or "models")
    if place.suffix == ".nwrp":
        raise TrainerError(f"-o {place} is one model, and {options.dataset} has {len(works)} data sets: give the "
                           "folder that their models go to")
    say = speaker(options)
    lines, results = [], []
    failed: list[Exception] = []
    for number, work in enumerate(works, 1):
        say(f"{work.label}, {number} of {len(works)}")
        try:
            result = train_work(options, work, place)
            lines.append(folders.summary(work.label, result["errors"], place / f"{work.name}.nwrp"))
        except (TrainerError, OSError, MemoryError) as error:
            why = str(error) if isinstance(error, TrainerError) else reason_of(error)
            result = {"dataSet": work.label, "error": why, "interrupted": False}
            failed.append(error)
            lines.append(f"{work.label}: failed, as {why}")
        results.append(result)
        if result["interrupted"]:
            lines += [f"{other.label}: not begun" for other in works[number:]]
            break
    for line in lines:
        say(line)
    if options.json:
        print(json.dumps(results, indent=1))
    if results[-1]["interrupted"]:
        return INTERRUPTED
    if failed:
        whys = "".join(f"; {one['dataSet']}: {one['error']}" for one in results if "error" in one)
        sentence = f"{len(failed)} of {len(works)} data sets became no model{whys}"
        is_locked = all(isinstance(error, LockedByAnother) for error in failed)
        raise LockedByAnother(sentence) if is_locked else TrainerError(sentence)
    return DONE


def train_work(options: argparse.Namespace, work: "Work", place: Path) -> dict[str, Any]:
    from .files import model_path

    if work.name is None:
        raise TrainerError(work.why)
    model = model_path(str(place / f"{work.name}.nwrp"))
    report = str(Path(options.report) / work.name) if options.report else None
    validation = Path(options.validation_set) / work.label if options.validation_set else None
    return {**train_one(options, work.folder, validation, lambda settings: model, report), "dataSet": work.label}


def pin_threads(count: int) -> None:
    """Before NumPy is loaded: its libraries take their threads from the environment, and sums depend on them."""
    if not 1 <= count <= 256:
        raise TrainerError(f"--threads is {count}, not a whole number from 1 to 256")
    for name in ("OPENBLAS_NUM_THREADS", "OMP_NUM_THREADS", "MKL_NUM_THREADS"):
        os.environ[name] = str(count)


def output_path(options: argparse.Namespace, settings: "Settings") -> Path:
    from .files import model_path

    if options.output:
        return model_path(options.output)
    if not settings.outputModelName:
        raise TrainerError("the data set names no model (train.outputModelName is empty): give one with -o NAME.nwrp")
    return model_path(str(Path("models") / Path(settings.outputModelName).name))


def speaker(options: argparse.Namespace) -> Callable[[str], None]:
    """Where lines for the user go: nowhere when quiet, to standard error when standard output is JSON."""
    if options.quiet:
        return lambda line: None
    return lambda line: print(line, file=sys.stderr if getattr(options, "json", False) else sys.stdout, flush=True)


def command_evaluate(options: argparse.Namespace) -> int:
    import numpy as np

    from . import certificate, evaluator, files, report
    from .dataset import load_dataset
    from .measure import as_lines, measured

    quarn = evaluator.find_quarn(options.quarn)
    dataset = load_dataset(options.dataset)
    if dataset.delta_count == 0:
        raise TrainerError(f"{options.dataset} has no deltas to compare with")
    model = evaluator.ModelDirectory(options.model, quarn)
    model.check_fits(dataset)
    measure = partial(measured, dataset, deltas_of=model.deltas, shapes=model.shapes)
    found = measure(np.arange(dataset.frame_count))
    if options.certify:
        certificate.add_errors(Path(options.model), dataset, found, measure)
    errors = {**found.errors, "ranWith": "quarn" if quarn else "numpy"}
    if options.report:
        with files.whole_folder(Path(options.report), report.ERROR_NAMES) as part:
            report.write_errors(part, errors, dataset, found)
    if options.json:
        print(json.dumps(errors, indent=1))
    else:
        print("\n".join([*as_lines(errors), f"the network ran with {errors['ranWith']}"]))
    return 0


def command_zero(options: argparse.Namespace) -> int:
    from . import export, files, pipeline
    from .dataset import load_dataset

    dataset = load_dataset(options.dataset)
    if dataset.delta_count == 0:
        raise TrainerError(f"{options.dataset} has no deltas, and a network without outputs cannot be loaded")
    target = files.model_path(options.output)
    with files.whole_folder(target, pipeline.MODEL_NAMES) as part:
        export.write_model(part, export.zero_model(dataset.control_count, 3 * dataset.delta_count),
                           export.metadata(dataset, None, None))
    speaker(options)(f"wrote {target}")
    return 0


def command_info(options: argparse.Namespace) -> int:
    from .dataset import load_dataset

    dataset = load_dataset(options.dataset)
    description = dataset.description
    if options.json:
        print(json.dumps({**description, "affectMap": None, "digest": dataset.digest}, indent=1))
        return 0
    print(f"{options.dataset}: {dataset.frame_count} frames, {dataset.control_count} controls, "
          f"{dataset.delta_count} deltas ({'Surface' if description['deltaMode'] else 'Offset'}, "
          f"{description['smoothingIterations']} smoothing passes)")
    print(f"geometry {description['geometry']}, {description['subsetState']}: {description['affectCount']} of "
          f"{description['fullCount']} vertices")
    for name, value in vars(dataset.settings).items():
        print(f"  {name} {value}")
    print(f"sha256 {dataset.digest}")
    return 0


COMMANDS: dict[str, Callable[[argparse.Namespace], int]] = {
    "train": command_train, "evaluate": command_evaluate, "zero": command_zero, "info": command_info}


def on_terminate(number: int, frame: Optional[FrameType]) -> None:
    raise Terminated


def main() -> int:
    signal.signal(signal.SIGTERM, on_terminate)
    try:
        options = parser().parse_args()
        status = COMMANDS[options.command](options)
        sys.stdout.flush()
        return status
    except UsageError as error:
        return complain(error, USAGE)
    except LockedByAnother as error:
        return complain(error, LOCKED)
    except TrainerError as error:
        return complain(error)
    except ModuleNotFoundError as error:
        if error.name not in PACKAGES:
            raise
        return complain(f"Python's {error.name} is missing in {sys.executable}: install it (Debian: "
                        f"{' '.join(PACKAGES.values())}), or choose another Python")
    except (OSError, MemoryError) as error:
        return complain(reason_of(error))
    except KeyboardInterrupt as error:
        return complain(f"interrupted {error}".strip(), INTERRUPTED)
    except Terminated:
        return TERMINATED


def reason_of(error: Union[OSError, MemoryError]) -> str:
    if isinstance(error, MemoryError):
        return "there is not enough memory"
    # files are opened, written and closed under their names; what is printed has none
    return f"{error.filename or 'standard output'}: {error.strerror}" if error.strerror else str(error)


def complain(error: object, status: int = FAILED) -> int:
    print(f"trainer: {error}", file=sys.stderr)
    return status


def run() -> NoReturn:
    """The program: also the entry point neuralwarp-train."""
    status = main()
    try:
        sys.stdout.flush()
    except BrokenPipeError:
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())
    sys.exit(status)


if __name__ == "__main__":
    run()
