# SPDX-License-Identifier: Apache-2.0
"""Plans that split the work of neuralWarp over machines, and engines that carry them out."""
