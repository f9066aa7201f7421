# SPDX-License-Identifier: Apache-2.0
"""The command line: neuralwarp-farm COMMAND ..."""

import argparse
import importlib
import json
import os
import sys
import time
from typing import NoReturn, Optional

from . import __version__, cancel, codes, plan, results, status, submit, sums, task
from .errors import FarmError, LockedByAnother, UsageError
from .kinds import KINDS


class Parser(argparse.ArgumentParser):
    def error(self, message: str) -> NoReturn:
        raise UsageError(f"{message} (see {self.prog} --help)")


def parser() -> Parser:
    main = Parser(prog="neuralwarp-farm", allow_abbrev=False,
                  description="Cuts work into tasks, and gives them to Slurm and other engines.")
    main.add_argument("--version", action="version", version=f"neuralwarp-farm {__version__}")
    commands = main.add_subparsers(dest="command", required=True, metavar="COMMAND")
    add_plan(commands)
    for module, text in ((submit, "give what is left of a plan to an engine"),
                         (cancel, "take back what an engine has of a plan")):
        command = commands.add_parser(module.__name__.rpartition(".")[2], help=text, allow_abbrev=False)
        module.add_arguments(command)
        command.set_defaults(run=module.run)

    state = commands.add_parser("status", allow_abbrev=False,
                                help="say how far a plan is; status 0 when it is complete, 3 not yet, 1 failed")
    add_place(state)
    state.add_argument("--json", action="store_true", help="answer in JSON")
    state.set_defaults(run=command_status)

    one = commands.add_parser("task", help="run one task here, as engines do", allow_abbrev=False)
    add_place(one)
    one.add_argument("id", metavar="ID")
    add_threads(one)
    one.set_defaults(run=command_task)

    merge = commands.add_parser("merge", help="put the parts of a plan together here", allow_abbrev=False)
    add_place(merge)
    add_threads(merge)
    merge.set_defaults(run=command_merge)

    table = commands.add_parser("table", help="show the models of a plan that are there, best first",
                                allow_abbrev=False)
    add_place(table)
    table.add_argument("--write", action="store_true", help="write it into the plan's folder, when all are there")
    table.set_defaults(run=command_table)
    return main


def add_place(command: argparse.ArgumentParser) -> None:
    command.add_argument("plan", metavar="PLAN", help="the plan's folder, or its plan.json")


def add_threads(command: argparse.ArgumentParser) -> None:
    command.add_argument("--threads", type=int, metavar="N",
                         help="if not given: what Slurm has allotted, or else the plan's cpus")


def add_plan(commands: "argparse._SubParsersAction[Parser]") -> None:
    command = commands.add_parser("plan", help="cut work into tasks", allow_abbrev=False)
    kinds = command.add_subparsers(dest="kind", required=True, metavar="KIND")
    for kind in KINDS:
        one = kinds.add_parser(kind.name, help=kind.help, allow_abbrev=False)
        one.set_defaults(run=command_plan, module=kind.module, kind=kind.name)
        importlib.import_module(f".kinds.{kind.module}", __package__).add_arguments(one)


# --- the commands ---

def command_plan(arguments: argparse.Namespace) -> int:
    begin = time.time()
    made = importlib.import_module(f".kinds.{arguments.module}", __package__).make_plan(arguments)
    if not plan.is_there(made):
        plan.check_replaceable(made, arguments.overwrite)
        results.make_room(made, arguments.overwrite)
    plan.write(made, arguments.overwrite)
    sums.remember(made, begin)
    print(status.sentence(made))
    return codes.DONE


def command_status(arguments: argparse.Namespace) -> int:
    report = status.report_of(plan.read(arguments.plan))
    print(json.dumps(report.to_json(), indent=1) if arguments.json else report.text())
    return report.code


def command_task(arguments: argparse.Namespace) -> int:
    the_plan = plan.read(arguments.plan)
    return task.run(the_plan, the_plan.task(arguments.id), arguments.threads)


def command_table(arguments: argparse.Namespace) -> int:
    from .kinds import training_table

    return training_table.show(plan.read(arguments.plan), arguments.write)


def command_merge(arguments: argparse.Namespace) -> int:
    the_plan = plan.read(arguments.plan)
    if all(task.id != "merge" for task in the_plan.tasks):
        raise FarmError(f"{the_plan.folder} has nothing to merge: each of its tasks writes to where its result belongs")
    return task.run(the_plan, the_plan.task("merge"), arguments.threads)


def main(words: Optional[list[str]] = None) -> int:
    os.umask(0o002)  # another of the group may go on
    try:
        arguments = parser().parse_args(words)
        code: int = arguments.run(arguments)
        sys.stdout.flush()
        return code
    except UsageError as error:
        return said(error, codes.USAGE)
    except LockedByAnother as error:
        return said(error, codes.LOCKED)
    except FarmError as error:
        return said(error, codes.FAILED)
    except BrokenPipeError:  # whoever read the answer has seen enough
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())
        return codes.FAILED
    except OSError as error:
        return said(error, codes.FAILED)
    except task.Ended as end:
        return end.code
    except KeyboardInterrupt:
        return said("interrupted", codes.INTERRUPTED)


def said(what: object, code: int) -> int:
    print(f"neuralwarp-farm: {what}", file=sys.stderr)
    return code


if __name__ == "__main__":
    sys.exit(main())
