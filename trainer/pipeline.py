# SPDX-License-Identifier: Apache-2.0
"""From a data set to a published model: targets, training, export, verification, errors."""

import time
from dataclasses import dataclass, field, replace
from pathlib import Path
from typing import Any, Callable, Optional

import numpy as np

from . import certificate, evaluator, export, files, limits, memory, plausible, progress, report, resume, warm
from .budget import budgeted, check_budget, say_size
from .checkpoint import Checkpoints
from .dataset import Dataset
from .device import Device
from .errors import TrainerError
from .guard import guard_of
from .halves import rounding, to_halves
from .line import Line, best_line
from .measure import Measured, measured
from .neighbourhoods import plugs_of, seen_by_neurons, shares
from .network import Network, Normalisation, build, check_size, measure_controls, parameter_count, predict
from .rest import with_rest
from .settings import Settings
from .shapes import principal_basis
from .split import Split, join, split_rows, split_with
from .training import History, fit, make_deterministic

MODEL_NAMES = ("model.onnx", "metadata.json", "principal_shapes.json", "principal_shapes.npz",
               certificate.POSES_NAME)
VERIFIED_ROWS = 64
TOLERANCE = 1e-4  # of the root mean square of the outputs

Trained = tuple[Network, Normalisation, History]


@dataclass(frozen=True)
class Job:
    """What a training run is asked for."""

    dataset: Dataset
    settings: Settings
    seed: int
    threads: int
    model: Path                 # the model directory
    report: Path                # the report folder
    quarn: Optional[str]        # path of the executable
    say: Callable[[str], None]  # takes a line for the user
    progress: bool
    validation: Optional[Dataset] = None  # rows that are held out; without it some of the data set's
    going_on: str = resume.ANEW             # from a checkpoint; a wish of resume
    checkpoint_every: float = resume.EVERY  # seconds
    device: Device = field(default_factory=lambda: Device("cpu"))
    first: Optional[Path] = None            # model directory whose network this one begins as
    progress_file: Optional[Path] = None    # that says how far it is


@dataclass(frozen=True)
class Targets:
    """What the network learns: deltas, or coefficients of principal shapes."""

    count: int
    of: Callable[[np.ndarray], np.ndarray]  # float32 [n, count] for sorted rows, root mean square about 1
    unit: float                             # by which the network's last layer is scaled
    shapes: Optional[np.ndarray] = None     # float32 [S, 3 * D] that the scaled outputs are coefficients of
    explained: Optional[float] = None
    packed: Optional[export.Packed] = None  # what the shapes are decoded from
    rounding: Optional[dict[str, Any]] = None  # what halves cost, over all rows
    budget: Optional[dict[str, Any]] = None  # what came of --basis-budget

    def deltas(self, outputs: np.ndarray) -> np.ndarray:
        """float32 [n, 3 * D] in scene units, of scaled outputs [n, count]."""
        return outputs if self.shapes is None else outputs @ self.shapes


def train(job: Job) -> dict[str, Any]:
    """Trains, verifies and publishes. Returns the report."""
    start = time.monotonic()
    dataset, settings = job.dataset, job.settings
    if dataset.delta_count == 0:
        raise TrainerError(f"{dataset.folder} has no deltas: its subset is {dataset.description['subsetState']}")
    if settings.principalShapesHalf and not settings.principalShapesEnabled:
        raise TrainerError("half precision is for principal shapes, and this model has none: give --principal-shapes "
                           "as well, or leave --half-shapes away")
    check_budget(settings)
    check_size(settings, dataset.control_count, 1 if settings.principalShapesEnabled else 3 * dataset.delta_count)
    make_deterministic(job.seed, job.threads)
    memory.warn_of_slow_blas(job.say)
    for doubt in plausible.doubts(dataset):
        job.say(doubt)
    job, split = split_job(job)
    split = with_rest(job.dataset, split)
    # the inner one is published first: a report without its model would be a lie
    with files.whole_folder(job.report, report.NAMES) as report_part:
        with files.whole_folder(job.model, MODEL_NAMES) as part:
            history, errors, result = train_into(job, part, split)
            result["seconds"] = time.monotonic() - start
            report.write_report(report_part, result, history, job.dataset, errors, job.say)
    if not history.interrupted:
        resume.discard(job.model)
    return result


def split_job(job: Job) -> tuple[Job, Split]:
    """The job over the rows of both data sets, where there are two, and which of these are for what."""
    if job.validation is None:
        return job, split_rows(job.dataset, job.settings.validationRatio, job.seed)
    split = split_with(job.dataset, job.validation, job.seed)
    return replace(job, dataset=join(job.dataset, job.validation)), split


def train_into(job: Job, part: Path, split: Split) -> tuple[History, Measured, dict[str, Any]]:
    """Trains and writes the model's files. Returns the history, the errors, and the report without the seconds."""
    targets = make_targets(job, split.train)
    check_size(job.settings, job.dataset.control_count, targets.count)
    trained, line = train_network(job, targets, split)
    measure = errors_of(job, trained, targets, split)
    errors = measure(split.measured()[1])
    knowledge = certificate.write(part, job.dataset, split, errors, measure)
    export_and_verify(job, part, trained, targets, split, knowledge)
    return trained[2], errors, {**summarise(job, trained, targets, split, errors),
                                **limits_of(job, trained, line, targets, split, errors), "sizes": report.sizes(part)}


# --- targets ---

def make_targets(job: Job, rows: np.ndarray) -> Targets:
    return principal_targets(job, rows) if job.settings.principalShapesEnabled else direct_targets(job, rows)


def direct_targets(job: Job, rows: np.ndarray) -> Targets:
    unit = root_mean_square(job.dataset, rows)
    deltas = job.dataset.deltas
    if memory.holds(deltas.nbytes, job.settings.preloadData, job.say):
        deltas = np.array(deltas)
    scale = np.float32(1 / unit)
    return Targets(deltas.shape[1], lambda rows: np.asarray(deltas[rows]) * scale, unit)


def root_mean_square(dataset: Dataset, rows: np.ndarray) -> float:
    total = sum(float(np.sum(np.square(block, dtype=np.float64))) for _, block in dataset.blocks(rows))
    plausible.require_any(dataset, total)
    return float(np.sqrt(total / (len(rows) * dataset.deltas.shape[1])))


def principal_targets(job: Job, rows: np.ndarray) -> Targets:
    dataset, settings = job.dataset, job.settings
    basis = principal_basis(dataset, rows, settings.principalShapesLimit, settings.principalShapesAccuracy, job.seed)
    job.say(f"{len(basis.shapes)} principal shapes hold {100 * basis.explained:.2f} % of the deltas")
    if basis.explained < settings.principalShapesAccuracy - 1e-9:
        job.say(f"that is less than the {100 * settings.principalShapesAccuracy:.2f} % asked for: the limit is "
                f"{settings.principalShapesLimit} shapes")
    export.check_shapes_size(len(basis.shapes), dataset.delta_count)
    everything = np.arange(dataset.frame_count)
    coefficients = np.concatenate([basis.coefficients(block) for _, block in dataset.blocks(everything)])
    # orthonormal shapes: the error of the coefficients is that of the deltas. In units of their common root mean
    # square the outputs are about 1; the shapes take the unit over, so that they are motions of a usual size.
    unit = np.sqrt(np.mean(np.square(coefficients[rows], dtype=np.float64)))
    coefficients *= np.float32(1 / unit)
    shapes = (basis.shapes.astype(np.float64) * unit).astype(np.float32)
    targets = Targets(len(shapes), lambda rows: coefficients[rows], 1.0, shapes, basis.explained)
    if settings.principalShapesBudget > 0:
        return replace(targets, **budgeted(dataset, rows, shapes, targets.of, settings.principalShapesBudget, job.say))
    return halved(job, targets, shapes) if settings.principalShapesHalf else targets


def halved(job: Job, targets: Targets, shapes: np.ndarray) -> Targets:
    """The same with shapes of half precision, and a word on what is lost."""
    halves = to_halves(shapes)
    decoded = halves.decoded()
    lost = rounding(job.dataset, np.arange(job.dataset.frame_count), targets.of, decoded - shapes)
    job.say(f"in half precision the shapes put vertices off by {lost['mean']['mm']:.2g} mm in the mean and "
            f"{lost['max']['mm']:.2g} mm at most")
    return replace(targets, shapes=decoded, packed=halves, rounding=lost)


# --- training and export ---

def train_network(job: Job, targets: Targets, split: Split) -> tuple[Trained, Line]:
    dataset, settings = job.dataset, job.settings
    normalisation = measure_controls(dataset.controls[split.train], targets.unit)
    if normalisation.still.any():
        names = [dataset.description["controlNames"][i] for i in np.flatnonzero(normalisation.still)]
        job.say(f"{len(names)} of {dataset.control_count} controls never move in these frames and get no influence, "
                f"as of a joint that turns about one axis only: {', '.join(names[:5])}"
                + (", ..." if len(names) > 5 else ""))
    weights = 4 * parameter_count(settings, dataset.control_count, targets.count)
    inputs = normalisation.normalised(dataset.controls)
    line = best_line(inputs, targets.of, split.train, normalisation.still)
    seen = seen_controls(job, line, targets) if settings.localNeurons else None
    with progress.noted_signals() as ended_by:
        job.say(f"training {weights // 4} parameters ({memory.text(5 * weights)} with what their training needs) on "
                f"{len(split.train)} frames, validating on {len(split.validation)}")
        network = build(settings, dataset.control_count, targets.count, normalisation.still, line, seen)
        if job.first:
            warm.begin_as(job.first, network, normalisation, targets.shapes, dataset, settings)
            job.say(f"beginning as {job.first}: rows that are held out may be among those that it was trained on, and "
                    "their errors flatter then")
        checkpoints = open_checkpoints(job, inputs, targets, split)
        with progress.counted(settings.epochs, job.say, job.progress, job.progress_file) as on_epoch:
            history = fit(network, inputs, targets.of, split, settings, job.seed, on_epoch, ended_by, job.device,
                          checkpoints)
    job.say(f"{len(history.train)} epochs, the best is {history.best_epoch} with a loss of {history.best_loss:.3e}")
    return (network, normalisation, history), line


def open_checkpoints(job: Job, inputs: np.ndarray, targets: Targets, split: Split) -> Checkpoints:
    first = None if job.first is None else warm.digest_of(job.first)
    identity = {**resume.identity_of(job.dataset, job.validation, job.settings, job.seed, job.threads, job.device.kind,
                                     first),
                "digest of what is learned": resume.digest_of(inputs, targets.of, split)}
    return resume.open_checkpoints(resume.checkpoint_path(job.model), identity, job.checkpoint_every, job.going_on,
                                   job.say)


def seen_controls(job: Job, line: Line, targets: Targets) -> np.ndarray:
    plugs = plugs_of(job.dataset.description["controlNames"])
    neighbours = shares(line.weights, targets.shapes, plugs)
    seen = seen_by_neurons(neighbours, plugs, job.dataset.control_count, job.settings.neuronsPerLayer)
    local = seen[~seen.all(axis=1)]
    job.say(f"{len(local)} of {len(seen)} neurons of the first layer see a neighbourhood"
            + (f", {local.mean():.0%} of the controls in the mean" if len(local) else ""))
    return seen


def export_and_verify(job: Job, part: Path, trained: Trained, targets: Targets, split: Split,
                      knowledge: dict[str, Any]) -> None:
    """Writes the model's files, runs them as others will, and refuses them where the outputs differ.

    knowledge: the certificate, whose own file is written already"""
    network, normalisation, history = trained
    guard = guard_of(job.settings, job.dataset.controls[split.train])
    model = export.onnx_model(network, normalisation, "deltas" if targets.shapes is None else "weights", guard)
    metadata = export.metadata(job.dataset, job.settings, job.seed)
    if history.interrupted:
        metadata["interruptedAfterEpochs"] = len(history.train)
    if job.first:
        metadata["firstNetwork"] = warm.digest_of(job.first)
    metadata["certificate"] = knowledge
    export.write_model(part, model, metadata, targets.shapes, targets.packed)
    if targets.budget is not None:
        say_size(targets.budget, part / "principal_shapes.npz", job.say)
    rows = split.measured()[1][:VERIFIED_ROWS]
    controls = job.dataset.controls[rows]
    wanted = predict(network, normalisation, controls, guard)
    compare(evaluator.NumpyModel(part / "model.onnx").run(controls), wanted, targets.unit, "the exported network")
    if job.quarn is None:
        job.say("there is no quarn: the model is not verified with the deformer's own runtime")
        return
    with evaluator.model_link(part, job.model.name) as link:
        outputs = evaluator.run_with_quarn(job.quarn, link, controls)
    compare(outputs, wanted, targets.unit, "the network as quarn runs it")


def compare(found: np.ndarray, wanted: np.ndarray, unit: float, called: str) -> None:
    if found.shape != wanted.shape:
        raise TrainerError(f"{called} gives {list(found.shape)} numbers where {list(wanted.shape)} are right: it is "
                           "not published")
    difference = float(np.max(np.abs(found - wanted))) if np.isfinite(found).all() else float("inf")
    if difference > TOLERANCE * unit:
        raise TrainerError(f"{called} differs by up to {difference:g} from the trained one, more than "
                           f"{TOLERANCE * unit:g}: it is not published")


def errors_of(job: Job, trained: Trained, targets: Targets, split: Split) -> Callable[[np.ndarray], Measured]:
    """Gives the errors over rows, ascending."""
    deltas = deltas_of(job, trained, targets, split)
    return lambda rows: measured(job.dataset, rows, deltas, targets.shapes)


def deltas_of(job: Job, trained: Trained, targets: Targets, split: Split) -> Callable[[np.ndarray], np.ndarray]:
    """What the model gives for controls [n, C]: deltas [n, 3 * D], in scene units."""
    network, normalisation, _ = trained
    guard = guard_of(job.settings, job.dataset.controls[split.train])
    return lambda controls: targets.deltas(predict(network, normalisation, controls, guard))


def limits_of(job: Job, trained: Trained, line: Line, targets: Targets, split: Split,
              errors: Measured) -> dict[str, Any]:
    """What a straight line would leave, what the model leaves where it was trained, and what keeps it from better."""
    normalisation, unit = trained[1], np.float32(trained[1].unit)
    on_trained = limits.on_trained_rows(job.dataset, split.train, deltas_of(job, trained, targets, split))
    return {"trainedRows": on_trained, "limit": limits.limit(errors.errors, on_trained, split.how != "none"),
            "line": limits.of_line(job.dataset, split.measured()[1], lambda controls: targets.deltas(
                line.outputs(normalisation.normalised(controls)) * unit))}


def summarise(job: Job, trained: Trained, targets: Targets, split: Split, errors: Measured) -> dict[str, Any]:
    network, _, history = trained
    held = None if job.validation is None else job.validation.folder.resolve().name
    return {
        "dataSet": job.dataset.folder.resolve().name, "model": job.model.name, "seed": job.seed,
        "threads": job.threads, "device": job.device.kind, "versions": report.versions(),
        "settings": vars(job.settings),
        "verifiedWithQuarn": job.quarn is not None, "heldOut": split.how != "none",
        "split": {**split.facts(), "validationSet": held}, "errors": errors.errors,
        "principalShapes": None if targets.shapes is None else len(targets.shapes), "explained": targets.explained,
        "halfPrecision": targets.rounding, "basisBudget": targets.budget,
        "parameters": sum(p.numel() for p in network.parameters()),
        "epochs": len(history.train), "bestEpoch": history.best_epoch, "bestLoss": history.best_loss,
        "interrupted": history.interrupted, "firstNetwork": None if job.first is None else job.first.name,
    }
