# SPDX-License-Identifier: Apache-2.0
"""Plans that split the work of neuralWarp over machines, and engines that carry them out."""

from pathlib import Path

BESIDE = Path(__file__).resolve().parents[3] / "VERSION"  # in a checkout, and where the package has installed it
__version__ = BESIDE.read_text().strip() if BESIDE.is_file() else "unknown"
