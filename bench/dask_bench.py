"""The timed part of bench/dask_bench.sh: TREE SCAN_SECONDS (of `metainfo scan`)."""
import logging
import os
import sys
import time

import distributed

import metainfo.dask as md


def row(name, rows, secs):
    print(f"{name:<40} {rows:>6} {secs:>8.2f} {rows / secs:>8.0f}", flush=True)


def main(tree, scan_s):
    files = sum(len(n) for _, _, n in os.walk(tree))
    print(f"machine: {os.cpu_count()} cores; {files} files in {tree}")
    print(f"{'run':<40} {'rows':>6} {'seconds':>8} {'files/s':>8}")
    row("metainfo scan (SQLite, all cores)", files, scan_s)
    start = time.perf_counter()
    alone = md.probe_rows(md._list_files([tree], None))
    row("one Python process (probe_rows)", len(alone), time.perf_counter() - start)
    for workers in (1, 2, 4):
        with distributed.LocalCluster(n_workers=workers, threads_per_worker=1, processes=True,
                                      dashboard_address=":0", silence_logs=logging.ERROR) as cluster:
            with distributed.Client(cluster) as client:
                start = time.perf_counter()
                rows = md.scan(tree, client=client, partition_size=50).compute()
                row(f"metainfo.dask.scan, {workers} worker(s)", len(rows), time.perf_counter() - start)


if __name__ == "__main__":
    main(sys.argv[1], float(sys.argv[2]))
