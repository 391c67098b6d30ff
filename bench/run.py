#!/usr/bin/env python3
"""Runs the benchmarks and prints a table of what they come to.

    bench/run.py [--quick] [--rows REGEX] [--runs N] [--bin DIR]

Each row runs in a process of its own. docs/benchmarks.md tells what the rows and floors are.
"""
import argparse
import json
import os
import re
import statistics
import subprocess
import sys
from dataclasses import dataclass
from pathlib import Path
from typing import Callable

MEBI = 2**20


def times_floor(run):
    return run["seconds"] / run["floor"]


def milliseconds(run):
    return run["seconds"] * 1e3


def mebibytes(run):
    return run["peak"] / MEBI


def times_data_beyond_program(run):
    return (run["peak"] - 16 * MEBI) / run["bytes"]


def times_data(run):
    return run["peak"] / run["bytes"]


def nanoseconds_an_item(run):
    return run["seconds"] * 1e9 / run["items"]


@dataclass
class Row:
    name: str  # what --rows is matched with
    work: str
    unit: str
    must: float
    goal: float
    program: str
    benchmark: str
    value: Callable[[dict], float]
    runs: int = 0  # instead of those asked for
    is_slow: bool = False


ROWS = [
    Row("large/plain", "8M triangles, plain .glb", "x plain floor", 2.0, 1.3,
        "bench_export", "large/plain", times_floor),
    Row("large/embedded", "8M triangles, embedded .gltf", "x embedded floor", 3.0, 1.6,
        "bench_export", "large/embedded", times_floor),
    Row("large/draco", "8M triangles, Draco", "x Draco floor", 1.10, 1.04,
        "bench_export", "large/draco", times_floor, runs=3, is_slow=True),
    Row("nodes/plain", "20,000 nodes and meshes, plain", "x plain floor", 4.0, 2.5,
        "bench_export", "nodes/plain", times_floor),
    Row("nodes/growth", "100,000 such nodes", "x 20,000 nodes", 6.0, 5.2,
        "bench_export", "nodes/growth", times_floor),
    Row("nodes/draco", "20,000 nodes and meshes, Draco", "x Draco floor", 1.25, 1.12,
        "bench_export", "nodes/draco", times_floor),
    Row("mesh/index", "single index, 200,000 polygons", "x index floor", 2.0, 1.3,
        "bench_mesh", "mesh/index", times_floor),
    Row("mesh/triangulate", "triangulation, 200,000 polygons", "x triangulator", 1.3, 1.1,
        "bench_mesh", "mesh/triangulate", times_floor),
    Row("animation/evaluate", "1,000 curves at 1,000 times", "ns an evaluation", 200, 100,
        "bench_animation", "animation/evaluate", nanoseconds_an_item),
    Row("animation/bake", "1,000 nodes, 1,000 frames", "x evaluation", 2.0, 1.5,
        "bench_animation", "animation/bake", times_floor),
    Row("animation/export", "the same, whole export", "x evaluation", 3.0, 2.0,
        "bench_animation", "animation/export", times_floor),
    Row("animation/nodes", "4,000 nodes, 1,000 frames", "x 1,000 nodes", 4.8, 4.2,
        "bench_animation", "animation/nodes", times_floor),
    Row("animation/frames", "1,000 nodes, 4,000 frames", "x 1,000 frames", 4.8, 4.2,
        "bench_animation", "animation/frames", times_floor),
    # No goals beyond: the value is what is asked for.
    Row("picture/png-load", "PNG of 2048 x 2048 to a picture", "x libpng", 1.1, 1.1,
        "bench_picture", "picture/png-load", times_floor),
    Row("picture/jpeg-load", "JPEG of 2048 x 2048 to a picture", "x libjpeg", 1.1, 1.1,
        "bench_picture", "picture/jpeg-load", times_floor),
    Row("picture/jpeg-save", "picture of 2048 x 2048 to JPEG", "x libjpeg", 1.05, 1.05,
        "bench_picture", "picture/jpeg-save", times_floor),
    Row("picture/resize", "4096 x 4096 RGB halved by Kaiser", "x convolution", 2.5, 2.5,
        "bench_picture", "picture/resize", times_floor),
    Row("picture/resize-time", "the same", "ns a pixel", 16.7, 16.7,
        "bench_picture", "picture/resize", nanoseconds_an_item),
    Row("picture/resize-memory", "the same, peak", "x pictures + 16 MiB", 1.0, 1.0,
        "bench_picture", "picture/resize-memory", times_data_beyond_program, runs=1),
    Row("picture/format", "4096 x 4096, RGB to RGBA and back", "x memcpy", 3.0, 3.0,
        "bench_picture", "picture/convert-format", times_floor),
    Row("picture/type", "4096 x 4096, 8 to 16 bits and back", "x memcpy", 3.0, 3.0,
        "bench_picture", "picture/convert-type", times_floor),
    Row("picture/normal-map", "4096 x 4096 heights", "ns a pixel", 16.7, 16.7,
        "bench_picture", "picture/normal-map", nanoseconds_an_item),
    Row("texture/jpeg", "16 colour maps of 2048 to JPEG", "x libraries", 1.15, 1.06,
        "bench_texture", "texture/jpeg", times_floor),
    Row("texture/pack", "16 grey pairs of 2048 packed", "x libraries", 1.35, 1.15,
        "bench_texture", "texture/pack", times_floor),
    Row("texture/pack-unequal", "16 of 2048 with 1024 packed", "x libraries", 2.6, 1.8,
        "bench_texture", "texture/pack-unequal", times_floor),
    Row("texture/halved", "16 colour maps of 2048 to 1024", "x libraries", 1.5, 1.15,
        "bench_texture", "texture/halved", times_floor),
    Row("texture/all", "16 materials with three maps", "x libraries", 1.25, 1.12,
        "bench_texture", "texture/all", times_floor),
    Row("texture/memory", "the same, peak", "MiB", 140, 115,
        "bench_texture", "texture/memory", mebibytes, runs=1),
    Row("storage/binary-write", "160 MB of arrays, binary", "x memcpy", 2.0, 1.3,
        "bench_storage", "storage/binary-write", times_floor),
    Row("storage/binary-read", "the same, reading", "x memcpy", 2.0, 1.3,
        "bench_storage", "storage/binary-read", times_floor),
    Row("storage/binary-write-nodes", "20,000 nodes, binary", "ns a node", 6000, 3000,
        "bench_storage", "storage/binary-write-nodes", nanoseconds_an_item),
    Row("storage/binary-read-nodes", "the same, reading", "ns a node", 6000, 3000,
        "bench_storage", "storage/binary-read-nodes", nanoseconds_an_item),
    Row("storage/json-write", "98 MB of JSON, large arrays", "ns a byte", 6.7, 5.5,
        "bench_storage", "storage/json-write", nanoseconds_an_item),
    Row("storage/json-read", "the same, reading", "ns a byte", 12.5, 6.5,
        "bench_storage", "storage/json-read", nanoseconds_an_item),
    Row("storage/json-write-nodes", "20,000 nodes, 7 MB of JSON", "ns a byte", 6.7, 5.5,
        "bench_storage", "storage/json-write-nodes", nanoseconds_an_item),
    Row("storage/json-read-nodes", "the same, reading", "ns a byte", 12.5, 11.0,
        "bench_storage", "storage/json-read-nodes", nanoseconds_an_item),
    Row("host/time", "program, 32 triangles, PLY", "ms", 30, 10,
        "bench_host", "host/ply", milliseconds),
    Row("host/memory", "program, 32 triangles, PLY, peak", "MiB", 24, 16,
        "bench_host", "host/ply", mebibytes),
    Row("host/obj-time", "program, 32 triangles, OBJ", "ms", 30, 10,
        "bench_host", "host/obj", milliseconds),
    Row("host/obj-memory", "program, 32 triangles, OBJ, peak", "MiB", 24, 16,
        "bench_host", "host/obj", mebibytes),
    Row("memory/plain", "peak, 8M triangles, plain", "x data + 16 MiB", 2.6, 2.15,
        "bench_export", "memory/plain", times_data_beyond_program, runs=1),
    Row("memory/embedded", "peak, 8M triangles, embedded", "x data", 6.5, 4.8,
        "bench_export", "memory/embedded", times_data, runs=1),
]


def run_row(row, folder, runs):
    command = [folder / row.program, f"--benchmark_filter=^{row.benchmark}/",
               f"--benchmark_repetitions={runs}", "--benchmark_format=json"]
    result = subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)
    if result.returncode != 0:
        sys.exit(f"{row.name} failed:\n{result.stderr}")
    return [run for run in json.loads(result.stdout)["benchmarks"]
            if run["run_type"] == "iteration"]


def summary(row, runs):
    """The value of the row, and the least and the greatest of the single runs.

    A ratio is that of the medians: what disturbs one run counts in neither of them."""
    single = [row.value(run) for run in runs]
    keys = [key for key in ("seconds", "floor", "peak", "bytes", "items") if key in runs[0]]
    medians = {key: statistics.median(run[key] for run in runs) for key in keys}
    return row.value(medians), min(single), max(single)


def verdict(row, value):
    if value <= row.goal:
        return "goal"
    return "must" if value <= row.must else "MISSED"


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("--quick", action="store_true", help="3 runs, without the slow row")
    parser.add_argument("--rows", default="", metavar="REGEX", help="only rows with such a name")
    parser.add_argument("--runs", type=int, default=9, metavar="N", help="runs of a row (9)")
    parser.add_argument("--bin", type=Path, metavar="DIR", help="folder of the programs",
                        default=Path(__file__).resolve().parent.parent / "build/bench/bin")
    options = parser.parse_args()

    load = ", ".join(f"{value:.1f}" for value in os.getloadavg())
    print(f"load {load} on {os.cpu_count()} processors\n")
    print(f"{'row':21} {'work':33} {'value':>7} {'least':>7} {'most':>7} {'unit':17} {'runs':>4} "
          f"{'must':>5} {'goal':>5}  reached")
    for row in ROWS:
        if not re.search(options.rows, row.name) or (options.quick and row.is_slow):
            continue
        count = min(row.runs or options.runs, 3 if options.quick else options.runs)
        value, least, most = summary(row, run_row(row, options.bin, count))
        print(f"{row.name:21} {row.work:33} {value:7.2f} {least:7.2f} {most:7.2f} {row.unit:17} "
              f"{count:4} {row.must:5} {row.goal:5}  {verdict(row, value)}", flush=True)


if __name__ == "__main__":
    main()
