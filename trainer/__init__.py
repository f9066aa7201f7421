# SPDX-License-Identifier: Apache-2.0
"""Turns a training data set that `quarn export` wrote into a model directory for the neuralWarp deformer.

Run it from the root of the repository: python3 -m trainer train DATASET -o models/NAME.nwrp
"""

import os

# the network runtime would collect what it runs and send it away, here and in every program that is started from here
os.environ.setdefault("ORT_DISABLE_TELEMETRY", "1")

__version__ = "0.1.0"
