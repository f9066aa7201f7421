# SPDX-License-Identifier: Apache-2.0


class Refused(Exception):
    """A sentence for the user that names the thing, and what is wrong with it."""
