# SPDX-License-Identifier: Apache-2.0
"""Who carries a plan out: Slurm, which is spoken to, and printers for whatever else a studio has (decision 0214)."""


from ..errors import UsageError
from ..plan import Plan
from .base import Engine, Options
from .lines import Lines
from .make import Make
from .openjd import OpenJobDescription
from .slurm import Slurm

__all__ = ["ENGINES", "Engine", "Options", "find", "states"]

ENGINES: tuple[Engine, ...] = (Slurm(), Make(), Lines(), OpenJobDescription())


def find(name: str) -> Engine:
    for engine in ENGINES:
        if engine.name == name:
            return engine
    raise UsageError(f'there is no engine "{name}": there are {", ".join(engine.name for engine in ENGINES)}')


def states(plan: Plan) -> dict[str, str]:
    """By task what the engine knows that it was sent by: "running", "pending", "held", "failed" or "gone"."""
    result: dict[str, str] = {}
    for engine in ENGINES:
        result.update(engine.states(plan))
    return result
