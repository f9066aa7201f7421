# SPDX-License-Identifier: Apache-2.0
"""The exit statuses, those of quarn and of the trainer."""

DONE = 0
FAILED = 1
USAGE = 2
NOT_YET = 3        # of status: nothing has failed, and not everything is done
LOCKED = 75        # another process has it; EX_TEMPFAIL of sysexits.h: try again
INTERRUPTED = 130  # Ctrl-C
TERMINATED = 143   # SIGTERM
