"""Prints the results of Google Benchmark as a table: "name/size" beside "name:peer/size" of the same run."""

import json
import sys


def nanoseconds(run):
    return run["real_time"] * {"ns": 1, "us": 1e3, "ms": 1e6, "s": 1e9}[run["time_unit"]]


def readable(time):
    for unit, size in (("s", 1e9), ("ms", 1e6), ("µs", 1e3)):
        if time >= size:
            return f"{time / size:.3g} {unit}"
    return f"{time:.3g} ns"


def main(path):
    with open(path, encoding="utf-8") as file:
        report = json.load(file)
    own, peers = {}, {}
    for run in report["benchmarks"]:
        name, _, size = run["name"].removesuffix("/real_time").partition("/")
        operation, _, peer = name.partition(":")
        if peer:
            peers.setdefault((operation, size), []).append((peer, nanoseconds(run)))
        else:
            own[operation, size] = run
    context = report["context"]
    print(f"{context['num_cpus']} cores at {context['mhz_per_cpu']} MHz, {context['date']}, load {context['load_avg'][:1]}\n")
    print("| benchmark | size | time | per element | working memory per element | times as long as |\n|---|---|---|---|---|---|")
    for (operation, size), run in own.items():
        time = nanoseconds(run)
        element = run.get("time/element")
        memory = run.get("working bytes/element")
        ratios = ", ".join(f"{peer}: {time / other:.2f}" for peer, other in peers.get((operation, size), []))
        print(f"| {operation} | {size} | {readable(time)} | {readable(element * 1e9) if element else ''}"
              f" | {f'{memory:.3g} bytes' if memory else ''} | {ratios} |")


main(sys.argv[1])
