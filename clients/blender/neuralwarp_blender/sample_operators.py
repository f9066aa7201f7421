# SPDX-License-Identifier: Apache-2.0
"""The operators of sampling and training: in the sidebar, and the same without a window. What is wrong is reported, and
nothing has changed then."""

from __future__ import annotations

import time
from collections import deque
from typing import Any, Iterator, Optional, Set

import bpy

from . import jobs, watch
from .operators import CANCELLED, ERRORS, FINISHED, ForMesh, refuse, reported
from .refused import Refused
from .run_folder import folder_of
from .sample_settings import settings_of
from .sampling import Progress, sample

RUNNING = {"RUNNING_MODAL"}
SLICE = 0.1  # seconds of work between two looks at the keyboard


class Sample(ForMesh):
    bl_idname = "neuralwarp.sample"
    bl_label = "Sample"
    bl_description = "Plays poses on the armature of the active mesh, and keeps what its modifiers make of them"
    _work: Optional[Iterator[Progress]] = None
    _timer: Any = None

    def begin(self, context: Any) -> Iterator[Progress]:
        thing = context.object
        # set before, as sampling may not change the file once it has begun
        thing.neuralwarp_sampling.is_sampled = True
        return sample(thing, settings_of(thing), lambda kind, text: self.report({kind}, text))

    def execute(self, context: Any) -> Set[str]:
        return reported(self, lambda: deque(self.begin(context), maxlen=0))

    def invoke(self, context: Any, event: Any) -> Set[str]:
        self._work = self.begin(context)
        manager = context.window_manager
        manager.progress_begin(0, 100)
        self._timer = manager.event_timer_add(0.01, window=context.window)
        manager.modal_handler_add(self)
        return RUNNING

    def modal(self, context: Any, event: Any) -> Set[str]:
        if event.type == "ESC":
            self.end(context)
            self.report({"WARNING"}, "sampling was cancelled")
            return CANCELLED
        if event.type != "TIMER":
            return RUNNING  # nobody else changes the file meanwhile
        until = time.monotonic() + SLICE
        try:
            while time.monotonic() < until:
                self.show(context, *next(self._work))  # type: ignore[arg-type]
        except StopIteration:
            self.end(context)
            self.report({"INFO"}, f"{context.object.name} is sampled")
            return FINISHED
        except ERRORS as error:
            self.end(context)
            return refuse(self, error)
        return RUNNING

    def show(self, context: Any, doing: str, done: int, total: int) -> None:
        context.window_manager.progress_update(100 * done // max(total, 1))
        context.workspace.status_text_set(f"neuralWarp: {doing}, {done} of {total}; Esc cancels")

    def cancel(self, context: Any) -> None:
        self.end(context)

    def end(self, context: Any) -> None:
        """However it ends: what sampling has changed is put back by the generator."""
        if self._work is not None:
            self._work.close()  # type: ignore[attr-defined]
            self._work = None
        manager = context.window_manager
        manager.progress_end()
        if self._timer is not None:
            manager.event_timer_remove(self._timer)
            self._timer = None
        context.workspace.status_text_set(None)


class Train(ForMesh):
    bl_idname = "neuralwarp.train"
    bl_label = "Train"
    bl_description = "Trains a model of what was sampled, or goes on with it, in a process that outlives Blender"
    __annotations__ = {
        "wait": bpy.props.BoolProperty(
            name="Wait", options={"SKIP_SAVE"}, description="For scripts: until the model is trained and published"),
    }

    def execute(self, context: Any) -> Set[str]:
        return reported(self, lambda: self.train(context.object))

    def train(self, thing: Any) -> None:
        folder = folder_of(thing)
        watch.set_outcome(folder, "")
        settings = thing.neuralwarp_sampling
        jobs.start(folder, settings.epochs, settings.with_report)
        if not self.wait:
            watch.begin()
            return
        now = jobs.wait(folder)
        if now.state != "done":
            raise Refused(f"the training of {thing.name} ended: {now.said}")
        watch.publish_into(thing)


class Cancel(ForMesh):
    bl_idname = "neuralwarp.cancel"
    bl_label = "Cancel"
    bl_description = "Ends the training of the active mesh; started again it goes on where it was"

    def execute(self, context: Any) -> Set[str]:
        return reported(self, lambda: jobs.cancel(folder_of(context.object)))


class Publish(ForMesh):
    bl_idname = "neuralwarp.publish"
    bl_label = "Publish"
    bl_description = "Puts the trained model of the active mesh beside the file, for use"

    def execute(self, context: Any) -> Set[str]:
        return reported(self, lambda: self.report({"INFO"}, f"published as {watch.publish_into(context.object)}"))


CLASSES = (Sample, Train, Cancel, Publish)

register, unregister = bpy.utils.register_classes_factory(CLASSES)
