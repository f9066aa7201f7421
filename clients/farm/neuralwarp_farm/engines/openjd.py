# SPDX-License-Identifier: Apache-2.0
"""A plan as a job template of Open Job Description (2023-09), which several render managers read."""

import json
import math
from typing import Any, Sequence

from ..errors import FarmError, UsageError
from ..plan import Plan, Resources, Task, write_whole
from .base import Options, Printer, stages, task_command

# what Open Job Description allows at most
MOST_STEPS = 100
MOST_VALUES = 1024  # of one task parameter
MOST_NAME = 64  # characters of a step's name; a job has twice as many
MOST_TEXT = 2048  # characters of a variable's value


class OpenJobDescription(Printer):
    """Writes FOLDER/farm.template.json: a step for each kind of tasks that are alike, with the tasks as a parameter."""

    name = "openjd"
    options: tuple[str, ...] = ("cpus", "memory_mb", "gpus", "constraint", "time")

    def submit(self, plan: Plan, tasks: Sequence[Task], options: Options) -> str:
        text = json.dumps(template(plan, tasks, options), indent=2) + "\n"
        if options.dry_run:
            return text
        path = plan.folder / "farm.template.json"
        write_whole(path, text)
        return f"Wrote {path}, a job template (jobtemplate-2023-09). Submit it with your farm's own tool."


def template(plan: Plan, tasks: Sequence[Task], options: Options) -> dict[str, Any]:
    result: dict[str, Any] = {
        "specificationVersion": "jobtemplate-2023-09",
        "name": literal(plan.name[: 2 * MOST_NAME]),
        "description": f"{plan.kind}: {len(tasks)} tasks of {plan.folder}"[:MOST_TEXT],
    }
    if plan.environment:
        for name, value in plan.environment.items():
            if len(value) > MOST_TEXT:
                raise UsageError(f"{name}: a variable of a job template has at most {MOST_TEXT} characters, "
                                 f"and this has {len(value)}")
        variables = {name: literal(value) for name, value in plan.environment.items()}
        result["jobEnvironments"] = [{"name": "plan", "variables": variables}]
    result["steps"] = steps(plan, tasks, options)
    return result


def steps(plan: Plan, tasks: Sequence[Task], options: Options) -> list[dict[str, Any]]:
    """Tasks of one stage with the same needs and resources are a step, or several where they are too many for one."""
    command = [literal(word) for word in task_command(plan, options)]
    result: list[dict[str, Any]] = []
    step_of: dict[str, str] = {}
    for stage in stages(tasks):
        alike: dict[tuple[Any, ...], list[Task]] = {}
        for task in stage:
            needs = tuple(sorted({step_of[need] for need in task.needs if need in step_of}))
            resources = options.over(task.resources)
            alike.setdefault((needs, resources.cpus, resources.memory_mb, resources.gpus), []).append(task)
        for (needs, *_), group in alike.items():
            for first in range(0, len(group), MOST_VALUES):
                members = group[first:first + MOST_VALUES]
                name = members[0].id if len(members) == 1 else ""
                if not 0 < len(name) <= MOST_NAME:
                    name = f"{plan.kind} {len(result) + 1}"
                result.append(step(name, needs, members, command, options))
                step_of.update((task.id, name) for task in members)
    if len(result) > MOST_STEPS:
        raise FarmError(f"a job template has at most {MOST_STEPS} steps, and this plan makes {len(result)}")
    return result


def step(name: str, needs: Sequence[str], tasks: Sequence[Task], command: Sequence[str],
         options: Options) -> dict[str, Any]:
    run: dict[str, Any] = {
        "command": command[0],
        "args": [*command[1:], "{{Task.Param.Task}}"],
        # SIGTERM first: a task keeps the rows that it has
        "cancelation": {"mode": "NOTIFY_THEN_TERMINATE", "notifyPeriodInSeconds": 60},
    }
    if options.time is not None:
        run["timeout"] = max(1, math.ceil(60 * options.time))
    result: dict[str, Any] = {"name": name}
    if needs:
        result["dependencies"] = [{"dependsOn": need} for need in needs]
    result["hostRequirements"] = host_requirements(options.over(tasks[0].resources), options)
    parameter = {"name": "Task", "type": "STRING", "range": [task.id for task in tasks]}
    result["parameterSpace"] = {"taskParameterDefinitions": [parameter]}
    result["script"] = {"actions": {"onRun": run}}
    return result


def host_requirements(resources: Resources, options: Options) -> dict[str, Any]:
    """Memory in MiB. A constraint is attr.NAME=VALUE, as in attr.worker.os.version=12."""
    amounts: list[dict[str, Any]] = [{"name": "amount.worker.vcpu", "min": max(1, resources.cpus)}]
    if resources.memory_mb:
        amounts.append({"name": "amount.worker.memory", "min": resources.memory_mb})
    if resources.gpus:
        amounts.append({"name": "amount.worker.gpu", "min": resources.gpus})
    attributes: list[dict[str, Any]] = [{"name": "attr.worker.os.family", "anyOf": ["linux"]}]
    if options.constraint is not None:
        name, equals, value = options.constraint.partition("=")
        if not (name.startswith("attr.") and equals and value):
            raise UsageError(f'--constraint is attr.NAME=VALUE for a job template, and not "{options.constraint}"')
        attributes.append({"name": name, "anyOf": [value]})
    return {"amounts": amounts, "attributes": attributes}


def literal(text: str) -> str:
    """A text that is a format string to its reader: braces in pairs would be filled in, and cannot be escaped."""
    if "{{" in text:
        raise UsageError(f'a job template cannot hold "{{{{": {text}')
    return text
