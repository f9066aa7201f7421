# SPDX-License-Identifier: Apache-2.0
"""From a data set to a published model: targets, training, export, verification, errors."""

import time
from dataclasses import dataclass

import numpy as np
import torch

from trainer import evaluator, export, files, memory, progress, report
from trainer.errors import TrainerError
from trainer.measure import measure
from trainer.network import build, check_size, measure_controls, parameter_count, predict
from trainer.shapes import principal_basis
from trainer.training import fit, make_deterministic, split_rows

MODEL_NAMES = ("model.onnx", "metadata.json", "principal_shapes.json")
VERIFIED_ROWS = 64
TOLERANCE = 1e-4  # of the root mean square of the outputs


@dataclass(frozen=True)
class Job:
    """What a training run is asked for."""

    dataset: object
    settings: object
    seed: int
    threads: int
    model: object       # path of the model directory
    report: object      # path of the report folder
    quarn: object       # path of the executable, or None
    say: object         # takes a line for the user
    progress: bool


@dataclass(frozen=True)
class Targets:
    """What the network learns: deltas, or coefficients of principal shapes."""

    count: int
    of: object              # float32 [n, count] for an array of sorted rows, root mean square about 1
    unit: float             # by which the network's last layer is scaled
    shapes: object = None   # float32 [S, 3 * D] that the scaled outputs are coefficients of
    explained: object = None


def train(job):
    """Trains, verifies and publishes. Returns the report."""
    start = time.monotonic()
    dataset, settings = job.dataset, job.settings
    if dataset.delta_count == 0:
        raise TrainerError(f"{dataset.folder} has no deltas: its subset is {dataset.description['subsetState']}")
    check_size(settings, dataset.control_count, 1 if settings.principalShapesEnabled else 3 * dataset.delta_count)
    make_deterministic(job.seed, job.threads)
    memory.warn_of_slow_blas(job.say)
    split = split_rows(dataset.frame_count, settings.validationRatio, job.seed)
    # the inner one is published first: a report without its model would be a lie
    with files.whole_folder(job.report, report.NAMES) as report_part:
        with files.whole_folder(job.model, MODEL_NAMES) as part:
            history, result = train_into(job, part, split)
            result["seconds"] = time.monotonic() - start
            report.write_report(report_part, result, history)
    return result


def train_into(job, part, split):
    """Trains and writes the model's files. Returns the history and the report, without the seconds."""
    targets = make_targets(job, split[0])
    check_size(job.settings, job.dataset.control_count, targets.count)
    network, normalisation, history = train_network(job, targets, split)
    export_and_verify(job, part, network, normalisation, targets, split, history)
    return history, summarise(job, network, normalisation, targets, split, history)


# --- targets ---

def make_targets(job, rows):
    unit = root_mean_square(job.dataset, rows)
    if unit == 0:
        raise TrainerError(f"every delta of {job.dataset.folder} is 0: check that the targets were connected when it "
                           "was exported ('trainer zero' makes a model that outputs zeros)")
    return principal_targets(job, rows) if job.settings.principalShapesEnabled else direct_targets(job, unit)


def root_mean_square(dataset, rows):
    total = sum(float(np.sum(np.square(block, dtype=np.float64))) for _, block in dataset.blocks(rows))
    return float(np.sqrt(total / (len(rows) * dataset.deltas.shape[1])))


def direct_targets(job, unit):
    deltas = job.dataset.deltas
    if memory.holds(deltas.nbytes, job.settings.preloadData, job.say):
        deltas = np.array(deltas)
    scale = np.float32(1 / unit)
    return Targets(deltas.shape[1], lambda rows: np.asarray(deltas[rows]) * scale, unit)


def principal_targets(job, rows):
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
    return Targets(len(shapes), lambda rows: coefficients[rows], 1.0, shapes, basis.explained)


# --- training and export ---

def train_network(job, targets, split):
    dataset, settings = job.dataset, job.settings
    normalisation = measure_controls(dataset.controls[split[0]], targets.unit)
    if normalisation.still.any():
        names = [dataset.description["controlNames"][i] for i in np.flatnonzero(normalisation.still)]
        job.say(f"{len(names)} of {dataset.control_count} controls never move in these frames and get no influence, as of a "
                f"joint that turns about one axis only: {', '.join(names[:5])}"
                + (", ..." if len(names) > 5 else ""))
    weights = 4 * parameter_count(settings, dataset.control_count, targets.count)
    job.say(f"training {weights // 4} parameters ({memory.text(5 * weights)} with what their training needs) on "
            f"{len(split[0])} frames, validating on {len(split[1])}")
    network = build(settings, dataset.control_count, targets.count, normalisation.still)
    with progress.counted(settings.epochs, job.say, job.progress) as on_epoch, \
            progress.noted_interrupt() as is_interrupted:
        history = fit(network, normalisation.normalised(dataset.controls), targets.of, split, settings, job.seed,
                      on_epoch, is_interrupted)
    job.say(f"{len(history.train)} epochs, the best is {history.best_epoch} with a loss of {history.best_loss:.3e}")
    return network, normalisation, history


def export_and_verify(job, part, network, normalisation, targets, split, history):
    """Writes the model's files, runs them as others will, and refuses them where the outputs differ."""
    model = export.onnx_model(network, normalisation, "deltas" if targets.shapes is None else "weights")
    metadata = export.metadata(job.dataset, job.settings, job.seed)
    if history.interrupted:
        metadata["interruptedAfterEpochs"] = len(history.train)
    export.write_model(part, model, metadata, targets.shapes)
    rows = report_rows(split)[:VERIFIED_ROWS]
    controls = job.dataset.controls[rows]
    wanted = predict(network, normalisation, controls)
    compare(evaluator.NumpyModel(part / "model.onnx").run(controls), wanted, targets.unit, "the exported network")
    if job.quarn is None:
        job.say("there is no quarn: the model is not verified with the deformer's own runtime")
        return
    with evaluator.model_link(part, job.model.name) as link:
        outputs = evaluator.run_with_quarn(job.quarn, link, controls)
    compare(outputs, wanted, targets.unit, "the network as quarn runs it")


def compare(found, wanted, unit, called):
    if found.shape != wanted.shape:
        raise TrainerError(f"{called} gives {list(found.shape)} numbers where {list(wanted.shape)} are right: it is "
                           "not published")
    difference = float(np.max(np.abs(found - wanted))) if np.isfinite(found).all() else float("inf")
    if difference > TOLERANCE * unit:
        raise TrainerError(f"{called} differs by up to {difference:g} from the trained one, more than "
                           f"{TOLERANCE * unit:g}: it is not published")


def report_rows(split):
    """Rows that errors are measured on: those held out, or all where none was."""
    return split[1] if len(split[1]) else split[0]


def summarise(job, network, normalisation, targets, split, history):
    def deltas_of(controls):
        outputs = predict(network, normalisation, controls)
        return outputs if targets.shapes is None else outputs @ targets.shapes

    return {
        "dataSet": job.dataset.folder.resolve().name, "model": job.model.name, "seed": job.seed,
        "threads": job.threads, "torch": str(torch.__version__), "settings": vars(job.settings),
        "verifiedWithQuarn": job.quarn is not None, "heldOut": len(split[1]) > 0,
        "errors": measure(job.dataset, report_rows(split), deltas_of, targets.shapes),
        "principalShapes": None if targets.shapes is None else len(targets.shapes), "explained": targets.explained,
        "parameters": sum(p.numel() for p in network.parameters()),
        "epochs": len(history.train), "bestEpoch": history.best_epoch, "bestLoss": history.best_loss,
        "interrupted": history.interrupted,
    }
