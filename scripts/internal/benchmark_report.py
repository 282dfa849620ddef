"""Tables and plots of what the benchmark programs measured."""

from __future__ import annotations

import dataclasses
import os
import platform
import subprocess
from collections.abc import Iterator
from pathlib import Path

from benchmark_runs import Row, Sample, Setting, count_of, groups_of

OWN = "Modeling"
COPY = "memcpy"
OWN_LOOPS = ("flat", "copy and fill", "in place", "single", "length")  # contenders that are not peers
MANY = 100_000  # elements: for fewer, whole pages hide what each takes

Results = dict[tuple[Row, Setting], Sample]


@dataclasses.dataclass(frozen=True)
class Operation:
    title: str
    element: str
    between: str = " × "  # numbers of the size
    shown: tuple[str, ...] = ()  # sizes that the overview shows; otherwise the largest that most contenders have
    note: str = ""  # how peers differ


OPERATIONS = {
    "subdivide uniform": Operation(
        "√3-subdivision, uniform: four steps", "face of the result",
        note="Peers take the mesh from arrays in the time that is measured.",
    ),
    "subdivide adaptive": Operation(
        "√3-subdivision, adaptive", "face of the result",
        note="OpenMesh refines by composite rules until faces fit the same box; its result has another number of faces.",
    ),
    "halfEdges": Operation(
        "adjacency of a mesh in order", "face",
        note="CGAL and OpenMesh build their meshes from arrays. meshoptimizer finds only the point across each edge, VTK only the "
        "faces at each point.",
    ),
    "halfEdges shuffled": Operation(
        "adjacency of a shuffled mesh", "face",
        note="CGAL and OpenMesh build their meshes from arrays. meshoptimizer finds only the point across each edge, VTK only the "
        "faces at each point.",
    ),
    "mergeMeshes": Operation(
        "merge meshes", "face", shown=("2/1000000", "3000/500"),
        note="Attributes: normals, texture coordinates of corners, materials. VTK has no attributes of corners; Open3D stores doubles.",
    ),
    "mergePointClouds": Operation(
        "merge point clouds", "point",
        note="Open3D has normals and colors in double precision, with twice the bytes.",
    ),
    "addPointsToPointCloud": Operation(
        "append points to a copy", "point of the result", " + ", ("9000000/1000000",),
        note="PCL stores 48 bytes per point and Open3D 72, Modeling 32."
        ' "Copy and fill" writes the same arrays on one thread.',
    ),
    "addPointsToPointCloudInPlace": Operation(
        "append points in place", "added point", " + ",
        note="PCL stores 48 bytes per point, Modeling 32.",
    ),
    "addPointsToPointCloudRepeatedly": Operation("append a thousand points at a time", "added point", " + 1,000 × "),
    "deleteFaces": Operation(
        "delete half of the faces", "face",
        note="Attributes: normals, texture coordinates of corners, materials. VTK leaves out the second, Open3D the last two. "
        "meshoptimizer renumbers points; the loop over faces is ours.",
    ),
    "deletePointsInPointCloud": Operation(
        "delete half of the points", "point",
        note="PCL stores 48 bytes per point and Open3D 72, Modeling 32.",
    ),
    "triangulate quads": Operation(
        "triangulate bent quads", "triangle",
        note='"Flat diagonals" reads and writes the same arrays on one thread, with little arithmetic.',
    ),
    "triangulate polygons": Operation(
        "triangulate concave polygons of 4 to 12 corners", "triangle",
        note="VTK gives up on some polygons, which leaves out about one of 60 triangles.",
    ),
    "triangulate comb": Operation("triangulate one polygon", "triangle"),
    "triangulate attributes": Operation("triangulate bent quads with four attributes", "triangle"),
    "smooth triangles": Operation(
        "smooth jittered triangles", "face and step", shown=("500000",),
        note="Methods differ: VTK uses a windowed sinc filter, OpenMesh the tangential component, Open3D weights by distance.",
    ),
    "smooth shuffled triangles": Operation("smooth shuffled triangles", "face and step"),
    "smooth quads, a corner": Operation("smooth quads", "corner and step"),
    "removeSlivers": Operation(
        "remove needles", "face",
        note="CGAL computes in double precision and repeats until it finds no more needles.",
    ),
    "removeSlivers at hubs": Operation("remove needles around two hubs", "face"),
    "stitch coordinates": Operation(
        "mean value coordinates", "point",
        note="Modeling also finds points on edges and heights above the polygon.",
    ),
    "stitch fill": Operation("make a pattern of strands", "control point"),
    "stitch findControlPointPos": Operation("place a control point", "control point"),
    "stitch lay on a million quads, threads": Operation("lay a pattern on a million quads, by threads", "control point"),
    "buildVolume": Operation("build a tile volume", "voxel", note="OpenVDB sets voxel after voxel by an accessor."),
    "sampleVolume": Operation(
        "sample a volume along a mesh", "sample",
        note="OpenVDB uses `BoxSampler` and one thread, as Modeling does here.",
    ),
    "sampleVolumeAtRandom": Operation("sample a volume in random order", "sample"),
    "samplePaddedVolume": Operation(
        "sample a padded volume along a mesh", "sample",
        note="OpenVDB uses `BoxSampler` and one thread, as Modeling does here.",
    ),
    "samplePaddedVolumeAtRandom": Operation("sample a padded volume in random order", "sample"),
    "markByVolume": Operation("mark faces by the values of a volume", "face"),
    "markByPaddedVolume": Operation("mark faces by the values of a padded volume", "face"),
}

INTRODUCTION = """# Benchmarks

Written by `scripts/benchmark --peers`, which installs the peers, builds everything, runs it and checks the results; repeat it on your
machine.

{machine}

All contenders get the same input. Every case runs in a process of its own, and the contenders of a row take turns, for up to
{rounds}; the fastest run counts. "Fresh" is the only run of a new process, which includes the first use of memory; the other
columns repeat the work in one process for at least {seconds} s, after one run that does not count. "Compared" is the time of a
contender divided by that of Modeling, repeated, with all threads: above 1 Modeling is faster. Peak memory is what becomes resident
beyond the input in a fresh run, result included, in bytes per element.

`memcpy` copies the bytes of the input, or of the result if that is larger, into new memory on one thread. "Flat" contenders are
loops over plain arrays, without objects and checks; those "after look-ups" have the host check each input and hand out each property
once before they copy. Peers use several threads if they offer it; the source of each row in [benchmarks](../benchmarks) says what a
peer leaves out or does besides. Results must be equal (numbers of elements, sums of values) or similar if methods differ, else the
run fails.
"""


THREADS = """
## Threads

Time in ns per element at the largest size, repeated. The serial share is the part of the work that one thread does while the others
wait, from the processor time and the wall time of runs with {threads}. The median of the runs counts, or the mean of short ones: in
some runs all threads wait for the host of a virtual machine, most of all for memory that is used for the first time, several times
as long as the work takes. Of several rounds, the one that waited least counts. Waiting for the memory itself counts as work. By
Amdahl's law the share allows the speed-ups in the last columns, if memory is fast enough for that many threads. Calls for one point,
polygon, volume or pattern run on the thread of the caller, who may make many at a time: their share is 100 %. Calls that append a
thousand points do so too, except the one that finds no room and copies the arrays.
"""


def size_of(row: Row) -> str:
    return operation_of(row).between.join(f"{int(part):,}" if part.isdigit() else part for part in row.size.split("/"))


def operation_of(row: Row) -> Operation:
    return OPERATIONS.get(row.operation, Operation(row.operation, "element"))


def describe_machine(threads: int, packages: list[str]) -> str:
    model = next((line.split(":", 1)[1].strip() for line in Path("/proc/cpuinfo").open() if line.startswith("model name")), "")
    memory = os.sysconf("SC_PAGE_SIZE") * os.sysconf("SC_PHYS_PAGES") / 2**30
    compiler = subprocess.run(["g++", "--version"], capture_output=True, text=True, check=True).stdout.splitlines()[0]
    listing = subprocess.run(["dpkg-query", "-W", "-f=${Package} ${Version}\\n", *packages], capture_output=True, text=True).stdout
    versions = [line for line in listing.splitlines() if packages and not line.endswith(" ")]
    machine = f"{model or platform.machine()}, {count_of(threads, 'processor')}, {memory:.0f} GB"
    lines = [f"- Machine: {machine}, {platform.system()} {platform.release()}", f"- Compiler: {compiler}"]
    return "\n".join(lines + ([f"- Peers: {', '.join(versions)}"] if versions else []))


def short(value: float) -> str:
    return f"{value:,.0f}" if value >= 100 else f"{value:.2g}" if value < 10 else f"{value:.3g}"


def nanoseconds(sample: Sample) -> str:
    return short(sample.per_element * 1e9) if sample.per_element else f"{short(sample.seconds * 1e3)} ms"


def peak(sample: Sample) -> str:
    if sample.peak_bytes is None or elements_of(sample) < MANY:
        return ""
    return short(max(sample.peak_bytes, 0))


def elements_of(sample: Sample) -> int:
    return round(sample.seconds / sample.per_element) if sample.per_element else 0


def extent(row: Row, sample: Sample) -> tuple[int, list[int]]:
    """Orders the rows of an operation by size: the number of elements, and for equally many the arguments of the row."""
    return elements_of(sample), [int(part) for part in row.size.split("/") if part.isdigit()]


def ratio(results: Results, row: Row, own: Row, setting: Setting) -> str:
    """The time of a row in terms of another one."""
    mine, other = results[row, setting], results[own, setting]
    if mine.per_element and other.per_element:
        return short(mine.per_element / other.per_element)
    return short(mine.seconds / other.seconds)


def serial_share(sample: Sample, threads: int) -> float:
    """The part of the processor time that one thread spends while the others wait.

    A second and b seconds of it on one and on all threads take a + b of processor time and a + b / threads of wall time.
    """
    assert sample.busy_threads
    return min(max((1 / sample.busy_threads - 1 / threads) / (1 - 1 / threads), 0), 1)


def threads_table(results: Results, settings: list[Setting], warm: Setting) -> Iterator[str]:
    """A line per operation at its largest size."""
    yield f"| operation, size | {' | '.join(str(setting) for setting in settings if not setting.is_fresh)} | serial share | 16 threads | 64 threads |"
    yield "| --- | --- | --- | --- | --- | --- |"
    own_rows = [row for row, setting in results if setting == warm and not row.contender and results[row, setting].busy_threads]
    for operation in order_of({row.operation for row in own_rows}):
        row = max((row for row in own_rows if row.operation == operation), key=lambda row: extent(row, results[row, warm]))
        times = [nanoseconds(results[row, setting]) for setting in settings if not setting.is_fresh]
        share = serial_share(results[row, warm], warm.threads)
        speedups = [f"{1 / (share + (1 - share) / count):.1f}" for count in (16, 64)]
        title = ", ".join(filter(None, [operation_of(row).title, size_of(row)]))
        yield f"| {title} | {' | '.join(times)} | {100 * share:.1f} % | {' | '.join(speedups)} |"


def details(results: Results, settings: list[Setting], warm: Setting) -> Iterator[str]:
    """A table per operation, with a line per size and contender."""
    fresh = next(setting for setting in settings if setting.is_fresh)
    groups = groups_of(dict.fromkeys(row for row, _ in results))
    for operation in order_of({group[0].operation for group in groups}):
        known = operation_of(Row(operation, "", "", ""))
        note = f" {known.note}" if known.note else ""
        yield f"\n### {known.title[0].upper()}{known.title[1:]}\n\nRow `{operation}`, ns per {known.element}.{note}\n"
        columns = ["size", "by", *(str(setting) for setting in settings), "compared", "peak bytes"]
        yield f"| {' | '.join(columns)} |"
        yield f"|{' --- |' * len(columns)}"
        for group in groups:
            own = next((row for row in group if not row.contender), None)
            for row in group if group[0].operation == operation else []:
                times = [nanoseconds(results[row, setting]) for setting in settings]
                cells = [size_of(row), row.contender or OWN, *times, ratio(results, row, own, warm) if own else "", peak(results[row, fresh])]
                yield f"| {' | '.join(cells)} |"


def order_of(operations: set[str]) -> list[str]:
    return [name for name in OPERATIONS if name in operations] + sorted(operations - set(OPERATIONS))


def overview(results: Results, settings: list[Setting], warm: Setting) -> Iterator[str]:
    """A line per operation."""
    yield f"| operation, size | element | ns | ns / {COPY} | peak bytes | peers / {OWN} |"
    yield "| --- | --- | --- | --- | --- | --- |"
    fresh = next(setting for setting in settings if setting.is_fresh)
    groups = [group for group in groups_of(dict.fromkeys(row for row, _ in results)) if not group[0].contender]
    for operation in order_of({group[0].operation for group in groups}):
        sizes = [group for group in groups if group[0].operation == operation]
        largest = max(sizes, key=lambda rows: (len(rows), extent(rows[0], results[rows[0], warm])))
        for own, *others in [group for group in sizes if group[0].size in operation_of(group[0]).shown] or [largest]:
            copy = next((row for row in others if row.contender == COPY), None)
            peers = [row for row in others if row != copy and not row.contender.startswith(OWN_LOOPS)]
            cells = [
                ", ".join(filter(None, [operation_of(own).title, size_of(own)])),
                operation_of(own).element,
                nanoseconds(results[own, warm]),
                ratio(results, own, copy, warm) if copy else "",
                peak(results[own, fresh]),
                ", ".join(f"{row.contender} {ratio(results, row, own, warm)}" for row in peers),
            ]
            yield f"| {' | '.join(cells)} |"


def quote(lines: list[str], readme: Path) -> None:
    """Replaces the lines of the README that begin like these."""
    by_title = {line.split("|")[1]: line for line in lines if not line.startswith("| ---")}
    text = readme.read_text(encoding="utf-8").split("\n")
    readme.write_text("\n".join(by_title.get(line.split("|")[1], line) if line.startswith("| ") else line for line in text), encoding="utf-8")


# -- Plots


def curves_of(results: Results, setting: Setting) -> dict[str, dict[str, list[tuple[float, float]]]]:
    """By operation and contender: nanoseconds per element against the number of elements, which is that of the library."""
    curves: dict[str, dict[str, list[tuple[float, float]]]] = {}
    for own, *others in groups_of(row for row, measured in results if measured == setting):
        for row in [own, *others] if not own.contender else []:
            time = results[row, setting].per_element
            if time and not row.contender.startswith(OWN_LOOPS):
                points = curves.setdefault(row.operation, {}).setdefault(row.contender or OWN, [])
                points.append((elements_of(results[own, setting]), time * 1e9))
    return curves


def draw(results: Results, setting: Setting, path: Path) -> bool:
    """A plot per operation that has several sizes; false if there is none."""
    import matplotlib

    matplotlib.use("svg")
    matplotlib.rcParams.update({"svg.hashsalt": "modeling", "font.size": 7, "lines.markersize": 2.5, "lines.linewidth": 1})
    from matplotlib import pyplot

    curves = curves_of(results, setting)
    sizes = {name: [elements for elements, _ in lines[OWN]] for name, lines in curves.items()}
    shown = [name for name in order_of(set(curves)) if max(sizes[name]) > 3 * min(sizes[name])]
    if not shown:
        return False
    peers = sorted({name for operation in shown for name in curves[operation]} - {OWN, COPY})
    styles = {OWN: {"color": "black", "linewidth": 2}, COPY: {"color": "gray", "linestyle": "--"}}
    styles.update({name: {"color": f"C{number}"} for number, name in enumerate(peers)})
    columns = min(4, len(shown))
    height = -(-len(shown) // columns)
    figure, axes = pyplot.subplots(height, columns, figsize=(3 * columns, 2.2 * height + 0.4), squeeze=False)
    for plot in axes.flat[len(shown) :]:
        plot.remove()
    for plot, operation in zip(axes.flat, shown):
        for contender, line in curves[operation].items():
            plot.loglog(*zip(*sorted(line)), marker="o", **styles[contender])
        known = operation_of(Row(operation, "", "", ""))
        plot.set_title(known.title, fontsize=7)
        plot.set_ylabel(f"ns per {known.element}", fontsize=6)
        plot.grid(alpha=0.2)
    figure.tight_layout(rect=(0, 0.2 / (2.2 * height), 1, 1 - 0.3 / (2.2 * height)))
    figure.legend(handles=[pyplot.Line2D([], [], label=name, **style) for name, style in styles.items()], loc="upper center", ncol=10)
    figure.supxlabel("elements", fontsize=7)
    figure.savefig(path, metadata={"Date": None}, facecolor="white")
    return True
