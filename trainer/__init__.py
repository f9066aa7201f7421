# SPDX-License-Identifier: Apache-2.0
"""Turns a training data set that `quarn export` wrote into a model directory for the neuralWarp deformer.

Run it from the root of the repository: python3 -m trainer train DATASET -o models/NAME.nwrp
"""

__version__ = "0.1.0"
