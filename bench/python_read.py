#!/usr/bin/env python3
"""Reads through the Python package, against numpy reading the same bytes.

    /usr/bin/python3 bench/python_read.py [--repeats N] [--dir DIR] [--no-write]

Workload W1: a gridded data file of 3 float items of 1000 x 1000 over 100
time steps (1.2 GB), written into a temporary folder (DIR, default the
system's) and deleted afterwards; an ensemble of 8 files of the same items
over 12 time steps each. Every read comes from the page cache (the files
were just written). Measured, as the median of N rounds (default 5):

0. a control: numpy work on 1 and on 2 threads (what the machine allows);
1. `np.fromfile` of the whole W1 file, the limit;
2. `xr.open_dataset(W1, engine="tova").load()` with the default masking
   (delete values to NaN) and with `mask_and_scale=False`;
3. dask, `chunks={"time": 10}`, every item summed with the threaded
   scheduler on 1 and on 2 threads;
4. the ensemble opened with `xr.open_mfdataset(parallel=True)` (one chunk
   per item and member) and every item summed on a `dask.distributed` LocalCluster of 1 and of 2 worker
   processes (one thread each).

The table goes to the section "Python package reads" of bench/RESULTS.md
(replaced when there; `bench/run` keeps it), unless --no-write.
"""

from __future__ import annotations

import argparse
import os
import platform
import shutil
import statistics
import subprocess
import sys
import tempfile
import threading
import time
from pathlib import Path

import numpy as np

ROOT = Path(__file__).resolve().parents[1]
sys.path.insert(0, str(ROOT / "python"))

import dask  # noqa: E402
import xarray as xr  # noqa: E402

import tova  # noqa: E402
from tova.xarray_backend import TovaBackendEntrypoint as ENGINE  # noqa: E402

SECTION = "## Python package reads"
ITEMS = ("u", "v", "level")
SHAPE = (1000, 1000)


def write(path: Path, steps: int, seed: int) -> None:
    """3 float items of 1000 x 1000, `steps` steps; as in a model's output,
    a strip of land along one edge (2 % of the cells) holds delete values."""
    grid = tova.Axis.equidistant(SHAPE[::-1])
    items = [tova.Item(name, "WaterLevel", "m", np.float32, grid) for name in ITEMS]
    rng = np.random.default_rng(seed)
    base = rng.random(SHAPE, dtype=np.float32)
    land = np.zeros(SHAPE, dtype=bool)
    land[:SHAPE[0] // 50] = True
    with tova.create(path, items, tova.TimeAxis.equidistant(600.0), stats_type=1) as w:
        for t in range(steps):
            values = base + np.float32(t)
            values[land] = tova.units.DELETE_VALUE_FLOAT
            w.append([values, values, values])


def median_times(actions, repeats: int) -> list:
    """(wall-clock, CPU time of this process) of each action, medians of
    `repeats` rounds; each round runs every action once, in turn, so that a
    disturbance of the machine falls on all of them alike. On a busy machine
    CPU time is the steadier of the two for work on one thread; it does not
    see other processes' work."""
    wall = [[] for _ in actions]
    cpu = [[] for _ in actions]
    for _ in range(repeats):
        for k, action in enumerate(actions):
            start, start_cpu = time.perf_counter(), time.process_time()
            action()
            wall[k].append(time.perf_counter() - start)
            cpu[k].append(time.process_time() - start_cpu)
    return [(statistics.median(w), statistics.median(c)) for w, c in zip(wall, cpu)]


def sum_items(ds, **compute):
    return dask.compute(*[ds[name].data.sum() for name in ITEMS], **compute)


def numpy_threads(threads: int) -> None:
    """The control: 16 rounds of np.sin over 4 M doubles shared among
    `threads` threads; numpy needs no lock for it, so its speed-up is what
    the machine itself allows."""
    values = np.random.default_rng(0).random(4_000_000)
    workers = [threading.Thread(target=lambda: [np.sin(values) for _ in range(16 // threads)])
               for _ in range(threads)]
    for worker in workers:
        worker.start()
    for worker in workers:
        worker.join()


def measure(folder: Path, repeats: int) -> list:
    rows = []
    alone, paired = median_times([lambda: numpy_threads(1), lambda: numpy_threads(2)], repeats)
    rows.append(("control: np.sin over 4 M doubles 16 times, 1 thread", alone, ""))
    rows.append(("the same, 2 threads", paired, f"{alone[0] / paired[0]:.2f}x 1 thread: what this machine "
                                                "allows two threads now"))
    w1 = folder / "w1.grd"
    write(w1, 100, 1)
    os.sync()  # no write-back of the new file while it is measured
    size = w1.stat().st_size

    def load(**options):
        with xr.open_dataset(w1, engine=ENGINE, **options) as ds:
            ds.load()

    fromfile, masked, raw = median_times([lambda: np.fromfile(w1, dtype=np.uint8), load,
                                          lambda: load(mask_and_scale=False)], repeats)
    rows.append(("np.fromfile of the whole file", fromfile, "1.00x (the limit)"))

    def versus(other, what, target=""):
        return (f"{fromfile[0] / other[0]:.2f}x {what} (CPU time: {fromfile[1] / other[1]:.2f}x)"
                + (f" (target >= {target})" if target else ""))

    rows.append(("open_dataset(...).load(), delete values to NaN", masked, versus(masked, "np.fromfile", "0.8x")))
    rows.append(("open_dataset(..., mask_and_scale=False).load()", raw, versus(raw, "np.fromfile")))

    # Chunks of 10 time steps (40 MB): dask's own work per task stays small
    # beside the read it schedules.
    with xr.open_dataset(w1, engine=ENGINE, chunks={"time": 10}) as ds:
        sum_items(ds, scheduler="threads", num_workers=2)  # warm: the file's handle pool is open
        one, two = median_times([lambda: sum_items(ds, scheduler="threads", num_workers=1),
                                 lambda: sum_items(ds, scheduler="threads", num_workers=2)], repeats)
    rows.append(("dask threads, chunks={'time': 10}, sum of every item: 1 thread", one, ""))
    rows.append(("the same, 2 threads", two, f"{one[0] / two[0]:.2f}x 1 thread (target >= 1.7x)"))
    w1.unlink()

    members = [folder / f"member{k}.grd" for k in range(8)]
    for k, path in enumerate(members):
        write(path, 12, 10 + k)
    os.sync()
    from distributed import Client, LocalCluster

    def reduce():
        # One chunk per item and member (48 MB): the client's work on the
        # graph stays small beside the workers' reads.
        with xr.open_mfdataset(members, engine=ENGINE, combine="nested", concat_dim="member", parallel=True,
                               chunks={}) as ens:
            sum_items(ens)

    # Both clusters live through the whole measurement and take turns (an
    # idle cluster costs next to nothing).
    clusters = [LocalCluster(n_workers=n, threads_per_worker=1, processes=True, dashboard_address=":0",
                             silence_logs=40) for n in (1, 2)]
    clients = [Client(cluster, set_as_default=False) for cluster in clusters]
    try:
        def on(client):
            def run():
                with dask.config.set(scheduler=client):
                    reduce()
            return run

        runs = [on(client) for client in clients]
        for run in runs:  # warm: the workers import the package and load the libraries
            run()
        ensemble = dict(zip((1, 2), median_times(runs, repeats)))
    finally:
        for closing in clients + clusters:
            closing.close()
    rows.append(("8-member ensemble, open_mfdataset(parallel=True), sum of every item: 1 worker process",
                 ensemble[1], ""))
    rows.append(("the same, 2 worker processes", ensemble[2], f"{ensemble[1][0] / ensemble[2][0]:.2f}x 1 worker "
                                                             "(target >= 1.7x)"))
    return rows, size


def report(rows, size: int, repeats: int, load_before: str, load_after: str) -> str:
    revision = subprocess.run(["git", "-C", str(ROOT), "rev-parse", "--short", "HEAD"], capture_output=True,
                              text=True).stdout.strip() or "unknown"
    lines = [SECTION, "",
             f"- Date: {time.strftime('%Y-%m-%d %H:%M UTC', time.gmtime())}; source {revision}; "
             f"command `/usr/bin/python3 bench/python_read.py --repeats {repeats}`",
             f"- Python {platform.python_version()}, numpy {np.__version__}, xarray {xr.__version__}, "
             f"dask {dask.__version__}; libtova from {tova.library_paths()[0]}",
             f"- nproc {os.cpu_count()}; load average (1, 5, 15 min) before: {load_before}; after: {load_after}",
             f"- W1: 3 float items of 1000 x 1000, 100 time steps, {size / 1e9:.2f} GB, 2 % delete values (a strip "
             "of land), read from the page cache; "
             "ensemble: 8 files of the same items over 12 time steps. Median of "
             f"{repeats} rounds.", "",
             "| what | median time | CPU time of this process | ratio |", "|---|---:|---:|---|"]
    lines += [f"| {what} | {wall * 1e3:.0f} ms | {cpu * 1e3:.0f} ms | {ratio} |" for what, (wall, cpu), ratio in rows]
    busy = max(float(load_before.split()[0]), float(load_after.split()[0])) if load_before[0].isdigit() else 0.0
    if busy > (os.cpu_count() or 1):
        share = statistics.median(cpu / wall for _, (wall, cpu), _ in rows[2:5])
        lines += ["", f"**The machine was busy** (load average {busy:.1f} on {os.cpu_count()} processors): this "
                  f"process got about {share:.2f} of a processor (CPU time / wall time of the single-threaded "
                  "reads). The CPU-time ratios are the steadier comparison of those reads; thread and "
                  "process scaling cannot show on a machine with no idle processor to spread over (the control "
                  "rows give what two threads of plain numpy got), so the 2-thread and 2-process figures of "
                  "such a run say little about the package."]
    return "\n".join(lines) + "\n"


def write_section(text: str) -> None:
    results = ROOT / "bench" / "RESULTS.md"
    old = results.read_text() if results.exists() else ""
    kept = old.split(SECTION)[0].rstrip("\n")
    results.write_text((kept + "\n\n" if kept else "") + text)


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    parser.add_argument("--repeats", type=int, default=5)
    parser.add_argument("--dir", default=None, help="folder for the temporary data files")
    parser.add_argument("--no-write", action="store_true", help="print the table only")
    args = parser.parse_args()
    load_before = " ".join(Path("/proc/loadavg").read_text().split()[:3]) if Path("/proc/loadavg").exists() else "?"
    folder = Path(tempfile.mkdtemp(prefix="tova-bench-", dir=args.dir))
    try:
        rows, size = measure(folder, args.repeats)
    finally:
        shutil.rmtree(folder, ignore_errors=True)
    load_after = " ".join(Path("/proc/loadavg").read_text().split()[:3]) if Path("/proc/loadavg").exists() else "?"
    text = report(rows, size, args.repeats, load_before, load_after)
    print(text)
    if not args.no_write:
        write_section(text)


if __name__ == "__main__":
    main()
