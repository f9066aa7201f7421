# SPDX-License-Identifier: Apache-2.0
"""The errors that a user sees."""


class FarmError(Exception):
    """What is wrong, as one sentence that names the thing, the value and, where there is one, the next step."""


class UsageError(FarmError):
    """A command line that cannot be understood."""


class LockedByAnother(FarmError):
    """Another process is at work on it: what answers LOCKED."""
