# SPDX-License-Identifier: Apache-2.0
"""Numbers of a command line, as types of argparse."""

import argparse
import math
import re


def whole(text: str) -> int:
    if not (text.isascii() and text.isdigit() and len(text) < 10):
        raise argparse.ArgumentTypeError(f"{text!r} is no whole number from 0")
    return int(text)


def positive(text: str) -> int:
    if whole(text) == 0:
        raise argparse.ArgumentTypeError("it is 0, not 1 at least")
    return int(text)


def above_zero(text: str) -> float:
    try:
        value = float(text)
    except ValueError:
        value = math.nan
    if not 0 < value <= 1e6:
        raise argparse.ArgumentTypeError(f"{text!r} is no number above 0")
    return value


def megabytes(text: str) -> int:
    found = re.fullmatch(r"([0-9]{1,9})([MGT]?)", text.upper())
    if not found:
        raise argparse.ArgumentTypeError(f"{text!r} is no size: write 4000, or 4G")
    return positive(found[1]) * {"": 1, "M": 1, "G": 1024, "T": 1024**2}[found[2]]
