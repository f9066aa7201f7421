# SPDX-License-Identifier: Apache-2.0
"""The entries of a JSON object, checked as they are taken: what is in a file is anybody's."""

import math
import re
from typing import Any, Callable, Optional, TypeVar

from .errors import FarmError

Value = TypeVar("Value")


class Fields:
    def __init__(self, content: Any, where: str) -> None:
        """`where`: the file and the place in it, as errors name them."""
        self.where = where
        if not isinstance(content, dict):
            raise FarmError(f"{where} is {shown(content)}, not an object")
        self.content: dict[str, Any] = content
        self.taken: set[str] = set()

    def error(self, name: str, what: str) -> FarmError:
        return FarmError(f"{self.where}: {name} {what}")

    def has(self, name: str) -> bool:
        return name in self.content

    def take(self, name: str) -> Any:
        self.taken.add(name)
        if name not in self.content:
            raise self.error(name, "is missing")
        return self.content[name]

    def optional(self, name: str, taking: Callable[[str], Value]) -> Optional[Value]:
        return None if self.take(name) is None else taking(name)

    def text(self, name: str, pattern: Optional["re.Pattern[str]"] = None) -> str:
        return self.checked_text(name, self.take(name), pattern)

    def checked_text(self, name: str, value: Any, pattern: Optional["re.Pattern[str]"] = None) -> str:
        if not isinstance(value, str) or "\0" in value:
            raise self.error(name, f"is {shown(value)}, not a text")
        if pattern and not pattern.fullmatch(value):
            raise self.error(name, f"is {shown(value)}, which is not of the form {pattern.pattern}")
        return value

    def whole(self, name: str, smallest: int, largest: int) -> int:
        value = self.take(name)
        if isinstance(value, bool) or not isinstance(value, int) or not smallest <= value <= largest:
            raise self.error(name, f"is {shown(value)}, not a whole number from {smallest} to {largest}")
        return value

    def number(self, name: str) -> float:
        value = self.take(name)
        if isinstance(value, bool) or not isinstance(value, (int, float)) or not 0 <= value <= 1e9:
            raise self.error(name, f"is {shown(value)}, not a number from 0 to 1e9")
        assert math.isfinite(value)
        return value

    def entries(self, name: str, largest: int) -> list[Any]:
        value = self.take(name)
        if not isinstance(value, list):
            raise self.error(name, f"is {shown(value)}, not a list")
        if len(value) > largest:
            raise self.error(name, f"has {len(value)} entries, and at most {largest} are read")
        return value

    def texts(self, name: str, largest: int) -> tuple[str, ...]:
        return tuple(self.checked_text(f"{name}[{index}]", value)
                     for index, value in enumerate(self.entries(name, largest)))

    def objects(self, name: str, largest: int) -> "list[Fields]":
        return [Fields(value, f"{self.where}: {name}[{index}]")
                for index, value in enumerate(self.entries(name, largest))]

    def object(self, name: str) -> "Fields":
        return Fields(self.take(name), f"{self.where}: {name}")

    def texts_by_name(self, name: str, pattern: Optional["re.Pattern[str]"] = None) -> dict[str, str]:
        entries = self.object(name)
        for key in entries.content:
            if pattern:
                self.checked_text(f"a name in {name}", key, pattern)
            entries.text(key)
        return dict(entries.content)

    def check_all_taken(self) -> None:
        """Raises FarmError for an entry that nobody has asked for: a slip of whoever wrote it."""
        for name in self.content:
            if name not in self.taken:
                raise self.error(shown(name), "is no entry that is known")


def shown(value: Any) -> str:
    """A value for an error, of bounded length."""
    text = ascii(value)
    return text if len(text) <= 60 else text[:57] + "..."
