# SPDX-License-Identifier: Apache-2.0
"""The sums of the files that tasks read. Of what was read once, size, times and inode are remembered: by who made the
plan for all hosts that see the same file, and by each host of what it has read itself."""

import hashlib
import json
import os
import socket
import time
from contextlib import suppress
from pathlib import Path
from typing import Any

from .errors import FarmError
from .plan import Plan, SourceFile, write_whole

SHARED = "sums.json"
BLOCK = 1 << 20
SETTLED = 2.0  # seconds: what changed so shortly before it was read may change again within the same time of change


def source_file(path: str) -> SourceFile:
    absolute = os.path.abspath(path)
    try:
        return SourceFile(absolute, os.stat(absolute).st_size, sum_of(absolute))
    except OSError as error:
        raise FarmError(f"{absolute} could not be read: {error.strerror}") from None


def sum_of(path: str) -> str:
    total = hashlib.sha256()
    with open(path, "rb") as file:
        while block := file.read(BLOCK):
            total.update(block)
    return f"sha256:{total.hexdigest()}"


def remember(plan: Plan, since: float) -> None:
    """For all hosts, as a hundred that read a cache of 10 GB at once have a server busy for long. A file that is
    another has another inode or time of change. `since`: a time before the files of the plan were read; what has
    changed after it is left out, as nobody knows what was read."""
    looks: dict[str, Any] = {}
    for file in plan.files:
        with suppress(OSError):
            state = os.stat(file.path)
            if state.st_ctime < since - SETTLED:
                looks[file.path] = look_of(state, file)
    write_whole(plan.state / SHARED, json.dumps(looks))


def look_of(state: os.stat_result, file: SourceFile) -> list[Any]:
    return [state.st_size, state.st_mtime_ns, state.st_ctime_ns, state.st_ino, file.sum]


def check(plan: Plan) -> None:
    """Raises FarmError, naming it, for a file that is not what it was when the plan was made."""
    place = plan.state / f"sums.{socket.gethostname()}.json"
    known = {**remembered(plan.state / SHARED), **remembered(place)}
    before = dict(known)
    for file in plan.files:
        check_file(file, known)
    if known != before:
        with suppress(FarmError):  # the next task reads them again
            write_whole(place, json.dumps(known))


def check_file(file: SourceFile, known: dict[str, Any]) -> None:
    try:
        state = os.stat(file.path)
        if file.sum == "missing":
            raise FarmError(f"{file.path} has appeared since the plan was made: make another plan")
        look = look_of(state, file)
        if known.get(file.path) == look:
            return
        if state.st_size != file.bytes or sum_of(file.path) != file.sum:
            raise FarmError(f"{file.path} has changed since the plan was made: make another plan, or put it back")
        if time.time() - state.st_ctime > SETTLED:
            known[file.path] = look
    except FileNotFoundError:
        if file.sum != "missing":
            raise FarmError(f"{file.path}, which the plan was made with, is not there on {socket.gethostname()}"
                            ) from None
    except OSError as error:
        raise FarmError(f"{file.path} could not be read: {error.strerror}") from None


def remembered(place: Path) -> dict[str, Any]:
    try:
        content = json.loads(place.read_bytes())
    except (OSError, ValueError):
        return {}
    return content if isinstance(content, dict) else {}
