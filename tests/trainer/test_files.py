# SPDX-License-Identifier: Apache-2.0
"""Folders are whole or not there, whatever happens while they are written."""

import multiprocessing
import os
import tempfile
import unittest
from contextlib import suppress
from pathlib import Path
from unittest import mock

from trainer import files
from trainer.errors import LockedByAnother, TrainerError

NAMES = ("a", "b")


class WholeFolderTest(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)
        self.target = self.place / "deep" / "model.nwrp"

    def write(self, text: str) -> None:
        with files.whole_folder(self.target, NAMES) as part:
            (part / "a").write_text(text)

    def content(self) -> dict[str, str]:
        self.assertEqual(os.listdir(self.target.parent), ["model.nwrp"])
        return {path.name: path.read_text() for path in self.target.iterdir()}

    def test_replaces_with_and_without_an_exchange(self) -> None:
        for exchange in (files.exchange, lambda *_: False):
            with mock.patch.object(files, "exchange", exchange):
                for text in ("one", "two"):
                    self.write(text)
                    self.assertEqual(self.content(), {"a": text})

    def test_an_exception_leaves_what_was_there(self) -> None:
        for error in (ValueError, KeyboardInterrupt):
            with self.assertRaises(error), files.whole_folder(self.target, NAMES) as part:
                (part / "a").write_text("half")
                raise error
            self.assertEqual(os.listdir(self.target.parent), [])
        self.write("one")
        with self.assertRaises(ValueError), files.whole_folder(self.target, NAMES) as part:
            (part / "b").write_text("half")
            raise ValueError
        self.assertEqual(self.content(), {"a": "one"})

    def test_what_killed_processes_left_is_removed(self) -> None:
        left = self.target.with_name("model.nwrp.part")
        (left / "folder").mkdir(parents=True)
        (left / "b").write_text("half")
        self.write("one")
        self.assertEqual(self.content(), {"a": "one"})
        # killed between the two renames: the old folder comes back, then is replaced
        self.target.rename(self.target.with_name("model.nwrp.old"))
        with self.assertRaises(ValueError), files.whole_folder(self.target, NAMES):
            raise ValueError
        self.assertEqual(self.content(), {"a": "one"})

    def test_nothing_of_others_is_replaced(self) -> None:
        self.target.mkdir(parents=True)
        (self.target / "thesis.txt").write_text("years")
        with self.assertRaisesRegex(TrainerError, "thesis.txt, which would be lost"):
            self.write("one")
        self.assertEqual(self.content(), {"thesis.txt": "years"})
        (self.place / "file.nwrp").write_text("years")
        with self.assertRaisesRegex(TrainerError, "is a file"), files.whole_folder(self.place / "file.nwrp", NAMES):
            pass

    def test_one_writer_at_a_time(self) -> None:
        with files.whole_folder(self.target, NAMES) as part:
            (part / "a").write_text("first")
            with self.assertRaisesRegex(LockedByAnother, "another process is writing"):
                self.write("second")
        self.assertEqual(self.content(), {"a": "first"})

    def test_many_writers_leave_one_whole_folder(self) -> None:
        """Each begins anew while others finish, until it has written some; `a` and `b` are of one writer."""
        def write_some(writer: int) -> None:
            for number in range(25):
                with suppress(LockedByAnother), files.whole_folder(self.target, NAMES) as part:
                    for name in NAMES:
                        (part / name).write_text(f"{writer} {number}")
                    if len(set(path.read_text() for path in part.iterdir() if path.name in NAMES)) != 1:
                        raise ValueError("another one writes here")

        self.write("one")
        writers = [multiprocessing.get_context("fork").Process(target=write_some, args=(n,)) for n in range(4)]
        for writer in writers:
            writer.start()
        for writer in writers:
            writer.join()
        self.assertEqual([writer.exitcode for writer in writers], [0] * 4)
        found = self.content()
        self.assertEqual(sorted(found), ["a", "b"])
        self.assertEqual(found["a"], found["b"])

    def test_names_of_models(self) -> None:
        for text, wanted in (("m/arm", "m/arm.nwrp"), ("m/arm.nwrp", "m/arm.nwrp"), ("arm.v2", "arm.v2.nwrp")):
            self.assertEqual(str(files.model_path(text)), wanted)
        with self.assertRaises(TrainerError):
            files.model_path("..")


if __name__ == "__main__":
    unittest.main()
