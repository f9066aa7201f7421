# SPDX-License-Identifier: Apache-2.0
"""The errors that a user sees."""


class TrainerError(Exception):
    """What is wrong, as one sentence that names the thing, the value and, where there is one, the next step."""


class UsageError(TrainerError):
    """A command line that cannot be understood."""


class Terminated(BaseException):
    """The process was asked to end (SIGTERM). Like KeyboardInterrupt, no handler of errors may catch it."""
