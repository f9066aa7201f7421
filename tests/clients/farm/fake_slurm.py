# SPDX-License-Identifier: Apache-2.0
"""sbatch, squeue, scancel and scontrol, by the name that it is called by: a queue in a file, in which nothing runs.

In the folder SLURM_CONF: jobs.json, the queue; `refuse` and `lose`, if they are there, count the sbatch calls until one
is refused, or is taken without an answer, and `hear` those of `scontrol requeue` until one is heard; `released`, the
jobs that were.
"""

import json
import os
import sys
import time

FOLDER = os.environ.get("SLURM_CONF", "")  # what the tools of Slurm are told of the cluster
QUEUE = os.path.join(FOLDER, "jobs.json")


def counted_down(name: str) -> bool:
    path = os.path.join(FOLDER, name)
    if not os.path.exists(path):
        return False
    with open(path) as file:
        left = int(file.read()) - 1
    with open(path, "w") as file:
        file.write(str(left))
    return left == 0


def write(jobs: "list[dict[str, object]]") -> None:
    with open(QUEUE, "w") as file:
        json.dump(jobs, file)


def main() -> int:
    tool = os.path.basename(sys.argv[0])
    options = dict(word[2:].split("=", 1) for word in sys.argv[1:] if word.startswith("--") and "=" in word)
    jobs = []
    if os.path.exists(QUEUE):
        with open(QUEUE) as file:
            jobs = json.load(file)
    assert "SQUEUE_FORMAT" not in os.environ
    if tool == "sbatch":
        time.sleep(0.2)  # two who submit at one moment would meet here
        if counted_down("refuse"):
            print("sbatch: error: invalid partition specified", file=sys.stderr)
            return 1
        tasks = int(options["array"].split("-")[1]) + 1 if "array" in options else 1
        jobs.append({"id": str(len(jobs) + 1), "options": options, "script": sys.argv[-1],
                     "states": ["PENDING"] * tasks, "environment": sorted(os.environ)})
        if counted_down("lose"):
            write(jobs)
            print("sbatch: error: Socket timed out on send/recv operation", file=sys.stderr)
            return 1
        print(jobs[-1]["id"])
    elif tool == "squeue":
        for job in jobs:
            name = job["options"]["job-name"]
            for index, state in enumerate(job["states"] if name in options["name"].split(",") else ()):
                state, _, reason = state.partition(" ")
                print(f"{job['id']}|{index if 'array' in job['options'] else 'N/A'}|{name}|{state}|{reason or 'None'}")
    elif tool == "scancel":
        for job in jobs:
            if job["id"] == sys.argv[-1] and job["options"]["job-name"] == options["name"]:
                ends = ("PENDING", options.get("state", "RUNNING"))
                job["states"] = ["CANCELLED" if state.split()[0] in ends else state for state in job["states"]]
    elif sys.argv[1] == "show":
        print("MaxArraySize            = 4")
    elif sys.argv[1] == "release":
        with open(os.path.join(FOLDER, "released"), "a") as file:
            print(*sys.argv[2:], file=file)
        return 0
    elif os.path.exists(os.path.join(FOLDER, "hear")) and not counted_down("hear"):
        print("slurm_requeue error: Socket timed out on send/recv operation", file=sys.stderr)
        return 1
    else:
        print("scontrol", *sys.argv[1:])
        return 0
    write(jobs)
    return 0


if __name__ == "__main__":
    sys.exit(main())
