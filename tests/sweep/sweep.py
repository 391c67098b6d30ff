#!/usr/bin/env python3
"""Exports models in every form and checks each result against its source.

Each model is exported as .glb, as .gltf with everything inside and as .gltf with side files, each
with and without compression. The results are read by a reader of their own (gltf_stats), and
triangles, surface area, volume and bounds are compared with the source (model_stats). The first
form is exported twice and must come out with the same bytes, also by way of a scene document in
either form; its vertices are compared with those of the source at ten times of its animation
(pose_check). Scene documents among the models have no source to be compared with. With --tools, the commands gltf-validate,
gltf-dump and gltf-render, if you have them, look at the results as well.

Prints one line for each model and form, and a summary. Exit code: 0 no fault, 1 faults, 2 wrong
usage.
"""

import argparse
import json
import math
import pathlib
import re
import shutil
import subprocess
import sys
from concurrent.futures import ThreadPoolExecutor
from dataclasses import dataclass, field

DOCUMENT = ".scene.json"
EXTENSIONS = (".obj", ".fbx", ".dae", ".ply", ".3ds", ".stl", DOCUMENT)
PROCESSES = 2
TIMEOUT = 900  # seconds for one process
BATCH = 200  # files for one process
NOISE = 1e-5  # relative error that single precision in matrices and positions may add up to
VIEWS = ("iso", "iso-back")

# Errors of gltf-validate that follow from the form of the files: nodes name their lights by an
# extension that the document does not declare.
EXPECTED_ERRORS = {
    "UNDECLARED_EXTENSION": re.compile(r"/nodes/\d+/extensions/KHR_materials_common"),
}


@dataclass(frozen=True)
class Form:
    name: str
    extension: str
    options: tuple

    @property
    def compressed(self):
        return self.options[self.options.index("-exportCompress") + 1] == "true"


FORMS = tuple(
    Form(f"{name}-{suffix}", extension, (*options, "-exportCompress", value))
    for name, extension, options in (
        ("glb", "glb", ()),
        ("embedded", "gltf", ()),
        ("sidefiles", "gltf", ("-exportEmbedded", "false")),
    )
    for suffix, value in (("plain", "false"), ("draco", "true"))
)


@dataclass
class Result:
    """One model in one form."""

    model: pathlib.Path
    form: Form
    output: pathlib.Path
    stats: dict = None
    pose: dict = None
    faults: list = field(default_factory=list)
    refused: bool = False

    def report(self, who, text):
        self.faults.append(f"{who}: {text}")


class Sweep:
    def __init__(self, arguments):
        self.export = arguments.export.resolve()
        self.stats = arguments.stats.resolve()
        self.out = arguments.out
        self.tools = arguments.tools and arguments.tools.resolve()
        self.render = arguments.render
        self.results = []

    # Processes.

    def run(self, *command):
        """Runs a command; its exit code is negative if a signal or the time ended it."""
        try:
            return subprocess.run(
                [str(part) for part in command],
                stdin=subprocess.DEVNULL,
                capture_output=True,
                timeout=TIMEOUT,
                encoding="utf-8",
                errors="replace",
            )
        except subprocess.TimeoutExpired:
            return subprocess.CompletedProcess(command, -1, "", f"not done in {TIMEOUT} s")

    def tool(self, name):
        path = self.tools / name if self.tools else None
        return path if path and path.exists() else None

    def read_stats(self, program, path):
        """The JSON that a program prints about a file, or None and the reason."""
        done = self.run(self.stats / program, path)
        if done.returncode != 0:
            return None, f"exit code {done.returncode}: {last_line(done.stderr)}"
        return json.loads(done.stdout), ""

    # One model.

    def check_model(self, model, folder):
        """Exports a model in all forms and compares each with the source."""
        is_document = model.name.endswith(DOCUMENT)
        source, reason = (None, "") if is_document else self.read_stats("model_stats", model)
        if source is None and not is_document:
            return [self.check_refusal(model, folder, reason)]
        results = []
        for form in FORMS:
            result = self.export_form(model, folder / form.name, form)
            results.append(result)
            if result.faults:
                continue
            result.stats, reason = self.read_stats("gltf_stats", result.output)
            if result.stats is None:
                result.report("reader", reason)
                continue
            for fault in result.stats["faults"]:
                result.report("reader", f"{fault['kind']} {fault['text']}")
            for text in compare(source, result.stats) if source else ():
                result.report("compare", text)
        if not results[0].faults:
            if source:
                self.check_pose(results[0])
            self.check_repetition(results[0], folder)
            for extension in ("scene", "scene.json"):
                self.check_document(results[0], folder / extension, extension)
        return results

    def check_pose(self, result):
        done = self.run(self.stats / "pose_check", result.model, result.output)
        if done.returncode != 0:
            result.report("pose", f"exit code {done.returncode}: {last_line(done.stderr)}")
            return
        result.pose = json.loads(done.stdout)
        if result.pose["farOff"]:
            result.report("pose", "{farOff} vertices lie off at the times {times}".format(**result.pose))

    def check_refusal(self, model, folder, reason):
        """A source that can't be read must not be exported either, and the program must say so."""
        result = Result(model, FORMS[0], self.prepare(model, folder / FORMS[0].name, FORMS[0]))
        done = self.run(self.export, *FORMS[0].options, model, result.output)
        if done.returncode == 2:
            result.refused = True
        else:
            result.report("export", f"exit code {done.returncode}, but model_stats: {reason}")
        return result

    def prepare(self, model, folder, form):
        shutil.rmtree(folder, ignore_errors=True)
        folder.mkdir(parents=True)
        return folder / f"{model.stem}.{form.extension}"

    def export_form(self, model, folder, form):
        result = Result(model, form, self.prepare(model, folder, form))
        done = self.run(self.export, *form.options, model, result.output)
        if done.returncode != 0:
            result.report("export", f"exit code {done.returncode}: {last_line(done.stderr)}")
        elif not result.output.is_file():
            result.report("export", "no output file")
        elif "-exportEmbedded" not in form.options and len(list(folder.iterdir())) > 1:
            result.report("export", "files beside the output")
        return result

    def check_repetition(self, first, folder):
        again = self.export_form(first.model, folder / (first.form.name + "-again"), first.form)
        first.faults += again.faults
        if not again.faults and again.output.read_bytes() != first.output.read_bytes():
            first.report("export", "a second export gives other bytes")
        shutil.rmtree(again.output.parent)

    def check_document(self, first, folder, extension):
        """Stored twice and exported from there, the scene must come out with the same bytes."""
        shutil.rmtree(folder, ignore_errors=True)
        folder.mkdir(parents=True)
        stored = [folder / f"{name}.{extension}" for name in ("first", "again")]
        output = folder / first.output.name
        for command in (
            (first.model, stored[0]),
            (first.model, stored[1]),
            (*first.form.options, stored[0], output),
        ):
            done = self.run(self.export, *command)
            if done.returncode != 0:
                first.report(extension, f"exit code {done.returncode}: {last_line(done.stderr)}")
                return
        texts = [path.read_bytes().replace(b"again.", b"first.") for path in stored]
        if texts[0] != texts[1]:
            first.report(extension, "stored a second time it has other bytes")
        if output.read_bytes() != first.output.read_bytes():
            first.report(extension, "exported from there it has other bytes")
        shutil.rmtree(folder)

    # The commands.

    def validate(self):
        """Runs gltf-validate over all outputs, with few processes."""
        by_path = {str(result.output): result for result in self.results if result.stats}
        paths = list(by_path)
        for start in range(0, len(paths), BATCH):
            batch = paths[start : start + BATCH]
            done = self.run(self.tool("gltf-validate"), "--json", *batch)
            if done.returncode not in (0, 1) or not done.stdout:
                for path in batch:
                    by_path[path].report("validate", last_line(done.stderr))
                continue
            for entry in json.loads(done.stdout)["files"]:
                for issue in entry["issues"]:
                    expected = EXPECTED_ERRORS.get(issue["code"])
                    if issue["severity"] == "error" and not (
                        expected and expected.fullmatch(issue["pointer"])
                    ):
                        by_path[entry["file"]].report(
                            "validate", "{code} {pointer}: {message}".format(**issue)
                        )

    def dump(self, result):
        done = self.run(self.tool("gltf-dump"), "--check", result.output)
        problems = [
            line.strip().removeprefix("!").strip()
            for line in done.stdout.splitlines()
            if line.strip().startswith("!")
        ]
        for problem in problems:
            result.report("dump", problem)
        if done.returncode != 0 and not problems:
            result.report("dump", f"exit code {done.returncode}: {last_line(done.stderr)}")

    def draw(self, result):
        for view in VIEWS:
            picture = result.output.parent / f"{view}.png"
            done = self.run(
                self.tool("gltf-render"), "--view", view, "--min-coverage", "0.01", result.output,
                picture,
            )
            if done.returncode != 0:
                result.report("render", f"{view}: {last_line(done.stderr)}")

    # All models.

    def sweep(self, models):
        with ThreadPoolExecutor(PROCESSES) as pool:
            for results in pool.map(lambda model: self.check_model(*model), models):
                self.results += results
            good = [result for result in self.results if result.stats]
            if self.tool("gltf-validate"):
                self.validate()
            if self.tool("gltf-dump"):
                list(pool.map(self.dump, good))
            if self.render and self.tool("gltf-render"):
                list(pool.map(self.draw, [r for r in good if r.form is FORMS[0]]))
        for result in self.results:
            print_result(result)
        return self.summarise()

    def summarise(self):
        faulty = [result for result in self.results if result.faults]
        compressed = [r for r in self.results if r.stats and r.form.compressed]
        lost = compressed and not any(r.stats["compressedPrimitives"] for r in compressed)
        if lost:
            print("FAULT no file was compressed, though it was asked for")
        used = [
            name
            for name in ("gltf-validate", "gltf-dump", *(["gltf-render"] if self.render else []))
            if self.tool(name)
        ]
        print(
            f"{len({result.model for result in self.results})} models,"
            f" {len(self.results)} outputs, {len(faulty)} with faults,"
            f" {sum(result.refused for result in self.results)} refused by reader and program;"
            f" checked with {', '.join(['gltf_stats', *used])}"
        )
        return 1 if faulty or lost else 0


def last_line(text):
    lines = [line for line in text.splitlines() if line.strip()]
    return lines[-1] if lines else "no message"


def compare(source, output):
    """Yields what an output has lost or gained against its source."""
    for name, removable in (
        ("triangles", "removableTriangles"),
        ("storedTriangles", "storedRemovableTriangles"),
    ):
        least = source[name] - source[removable]
        if not least <= output[name] <= source[name]:
            yield f"{name}: {output[name]}, expected {least}..{source[name]}"

    if not source["bounds"] or not output["bounds"]:
        if output["bounds"] or source["innerBounds"]:
            yield f"bounds: {output['bounds']}, expected {source['bounds']}"
        return
    corners = source["bounds"]["min"] + source["bounds"]["max"]
    largest = max(abs(coordinate) for coordinate in corners)
    inner = source["innerBounds"] or source["bounds"]
    for axis, error in enumerate(output["positionError"]):
        slack = NOISE * largest + error
        for end, sign in (("min", 1), ("max", -1)):
            value = sign * output["bounds"][end][axis]
            outside = sign * source["bounds"][end][axis]
            inside = sign * inner[end][axis]
            if (source["innerBounds"] and value > inside + slack) or value < outside - slack:
                yield f"bounds: {end}[{axis}] {sign * value}, expected {sign * outside}"

    slack = NOISE * source["largestArea"] + output["areaError"]
    least, most = source["leastArea"] - slack, source["largestArea"] + slack
    if not least <= output["area"] <= most:
        yield f"area: {output['area']}, expected {least}..{most}"

    # A triangle's part of the volume is a third of its area times the distance of its plane.
    reach = math.sqrt(3) * largest
    slack = source["volumeError"] + reach * slack + source["largestArea"] * (
        math.hypot(*output["positionError"]) + NOISE * largest
    )
    if not abs(output["volume"] - source["volume"]) <= slack:
        yield f"volume: {output['volume']}, expected {source['volume']} +- {slack}"


def print_result(result):
    line = f"{result.model} {result.form.name}:"
    if result.refused:
        line += " refused, as by the reader of models"
    if stats := result.stats:
        line += (
            f" {stats['triangles']} triangles, area {stats['area']:.6g},"
            f" {stats['meshes']} meshes, {stats['nodes']} nodes"
        )
        if result.form.compressed:
            line += f", {stats['compressedPrimitives']}/{stats['primitives']} compressed"
    if (pose := result.pose) and (pose["animations"] or pose["skins"]):
        line += (
            f", posed at {len(pose['times'])} times, off by {pose['largestDistance']:.1g} of its size"
        )
    print(("FAULT " if result.faults else "ok    ") + line)
    for fault in result.faults[:10]:
        print(f"      {fault}")
    if len(result.faults) > 10:
        print(f"      and {len(result.faults) - 10} more")


def find_models(arguments, out):
    """Pairs of a model and the folder for its outputs, which has the name of the model."""
    models = []
    for argument in arguments:
        if argument.is_dir():
            found = sorted(p for p in argument.rglob("*") if p.name.lower().endswith(EXTENSIONS))
            models += [(p, p.relative_to(argument)) for p in found if p.is_file()]
        elif argument.is_file():
            models.append((argument, pathlib.Path(argument.name)))
        else:
            sys.exit(f"sweep: no such file or folder: {argument}")
    taken = set()
    pairs = []
    for model, name in models:
        folder = out / name
        number = 1
        while folder in taken:
            number += 1
            folder = out / name.with_name(f"{name.name} {number}")
        taken.add(folder)
        pairs.append((model, folder))
    return pairs


def main():
    parser = argparse.ArgumentParser(
        description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter
    )
    add = parser.add_argument
    path = pathlib.Path
    add("--export", type=path, required=True, help="the program scene_export")
    add("--stats", type=path, required=True, help="the folder of model_stats and gltf_stats")
    add("--out", type=path, required=True, help="the folder for the outputs")
    add("--tools", type=path, help="the folder of gltf-validate, gltf-dump and gltf-render")
    add("--render", action="store_true", help="draw each model from two sides (needs --tools)")
    add("models", metavar="MODEL", type=path, nargs="+", help="a model, or a folder with models")
    arguments = parser.parse_args()
    for program in (arguments.export, arguments.stats / "gltf_stats"):
        if not program.is_file():
            parser.error(f"{program} does not exist")
    models = find_models(arguments.models, arguments.out)
    if not models:
        parser.error("no models found")
    return Sweep(arguments).sweep(models)


if __name__ == "__main__":
    sys.exit(main())
