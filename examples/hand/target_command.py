#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""target_command.py REQUEST.json: targets.py as a program for quarn run --target-command. The frames that are asked
for, which may be any of the skin's, in the order in which they are asked for."""

import json
import sys

import numpy as np
import targets


def main() -> None:
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    with open(sys.argv[1], encoding="utf-8") as file:
        request = json.load(file)
    if request["version"] != 1 or request["skin"]["order"] != "scene":
        sys.exit("target_command.py: knows requests of version 1 in the scene's order, not of version "
                 f"{request['version']} in the {request['skin']['order']}'s")
    # the folder in which it is started is its own
    skin = np.load(request["skin"]["file"], mmap_mode="r", allow_pickle=False)
    np.save("skin.npy", skin[[frame - request["skin"]["firstFrame"] for frame in request["frames"]]])
    sys.argv[1:] = [request["scene"], "skin.npy", "-o", request["write"], "--mesh", request["mesh"]]
    targets.main()


if __name__ == "__main__":
    main()
