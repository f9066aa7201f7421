# SPDX-License-Identifier: Apache-2.0
"""Turns a training data set that `quarn export` wrote into a model directory for the neuralWarp deformer.

Run it from the root of the repository: python3 -m trainer train DATASET -o models/NAME.nwrp
Where it is installed, that is neuralwarp-train train DATASET -o models/NAME.nwrp.
"""

import os
from importlib import metadata
from pathlib import Path

# the network runtime would collect what it runs and send it away, here and in every program that is started from here
os.environ.setdefault("ORT_DISABLE_TELEMETRY", "1")

BESIDE = Path(__file__).resolve().parent.parent / "VERSION"  # in a checkout, and where the package has installed it
__version__ = BESIDE.read_text().strip() if BESIDE.is_file() else metadata.version("neuralwarp")
