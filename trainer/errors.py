# SPDX-License-Identifier: Apache-2.0
"""The errors that a user sees, and what the program ends with: docs/exitCodes.md."""

DONE = 0
FAILED = 1
USAGE = 2
NOT_YET = 3        # of what asks how far work is, which nothing here does
LOCKED = 75        # another process has it; EX_TEMPFAIL of sysexits.h: try again
INTERRUPTED = 130  # Ctrl-C
TERMINATED = 143   # SIGTERM


class TrainerError(Exception):
    """What is wrong, as one sentence that names the thing, the value and, where there is one, the next step."""


class UsageError(TrainerError):
    """A command line that cannot be understood."""


class LockedByAnother(TrainerError):
    """Another process writes what was asked for: the same may be done when that one has ended."""


class Terminated(BaseException):
    """The process was asked to end (SIGTERM). Like KeyboardInterrupt, no handler of errors may catch it."""
