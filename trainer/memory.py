# SPDX-License-Identifier: Apache-2.0
"""What fits into this machine, and how fast its matrix products are."""

from typing import Callable, Optional


def text(size: float) -> str:
    return f"{size / 1e9:.1f} GB" if size >= 1e9 else f"{size / 1e6:.1f} MB"


def available() -> Optional[int]:
    """Bytes that can be taken without swapping; None where the system does not say."""
    try:
        with open("/proc/meminfo", encoding="ascii") as file:
            for line in file:
                if line.startswith("MemAvailable:"):
                    return 1024 * int(line.split()[1])
    except OSError:
        pass
    return None


def holds(size: int, wanted: bool, say: Callable[[str], None]) -> bool:
    """Whether to hold `size` bytes of deltas in memory. The model does not depend on it."""
    if not wanted:
        say(f"{text(size)} of deltas are read from the disk, batch by batch")
        return False
    free = available()
    if free is not None and size > 0.8 * free:
        say(f"{text(size)} of deltas do not fit into the {text(free)} of free memory: they are read from the disk, "
            "batch by batch, as with --no-preload")
        return False
    say(f"holding {text(size)} of deltas in memory")
    return True


def warn_of_slow_blas(say: Callable[[str], None]) -> None:
    """NumPy and PyTorch of some systems multiply matrices with the reference BLAS, an order of magnitude slower."""
    try:
        with open("/proc/self/maps", encoding="utf-8", errors="replace") as file:
            maps = file.read()
    except OSError:
        return
    if "/blas/libblas.so" in maps or "/libblas.so" in maps and "openblas" not in maps:
        say("NumPy and PyTorch run on the reference BLAS here: training is about ten times as fast with OpenBLAS "
            "(Debian: libopenblas0-pthread)")
