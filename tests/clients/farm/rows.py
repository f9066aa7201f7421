# SPDX-License-Identifier: Apache-2.0
"""rows.py FOLDER ROWS GO: writes a data set of as many rows, as programs of this project do: under a lock, in
FOLDER.part, where it goes on; all of it at once at the end. A row says who wrote it. The last one waits until there is
a file GO."""

import fcntl
import os
import signal
import sys
import time
from pathlib import Path


def main() -> int:
    folder, count, go = Path(sys.argv[1]), int(sys.argv[2]), Path(sys.argv[3])
    part = folder.with_name(folder.name + ".part")
    part.mkdir(parents=True, exist_ok=True)
    with open(part / "lock", "w") as lock, open(part / "rows", "a+") as rows:
        try:
            fcntl.flock(lock, fcntl.LOCK_EX | fcntl.LOCK_NB)
        except BlockingIOError:
            return 75
        rows.seek(0)
        begun = len(rows.readlines())
        signal.signal(signal.SIGTERM, lambda *_: sys.exit(143))
        for row in range(begun, count):
            while row == count - 1 and not go.exists():
                time.sleep(0.05)
            rows.write(f"{row} {os.getpid()}\n")
            rows.flush()
        (part / "dataset.json").write_text("{}")
        part.rename(folder)
    return 0


if __name__ == "__main__":
    sys.exit(main())
