"""Scanning folders with Dask: one row per file, in a dask DataFrame.

    scan(paths, client=None, partition_size=500) -> dask.dataframe.DataFrame

The columns are those of `metainfo probe --csv` (flattened keys: "audio.codec";
"pictures" counts the pictures), with stable dtypes. A file that cannot be
probed is a row whose "error" says why; no file is left out. Folders are listed
in parallel, one task per top-level subfolder, as `metainfo scan` lists them:
absolute paths, regular files only, symbolic links not followed, the root's
file system only.

    python3 -m metainfo.dask SCHEDULER_ADDRESS PATH... --out DIR

writes the rows to DIR as partitioned Parquet (when pyarrow is there) or CSV.
"""

import argparse
import os
import stat
import sys

import pandas as pd

import metainfo

# Numbers whose absence is null (pandas' nullable integers); every other
# column but the two below is text.
_INTEGERS = {
    "size", "bit_rate", "audio.sample_rate", "audio.channels", "audio.bits_per_sample", "audio.bit_rate",
    "video.level", "video.width", "video.height", "video.bit_rate", "tags.year", "tags.track",
    "tags.track_total", "tags.disc", "tags.disc_total", "pictures",
}
_FLOATS = {"duration", "video.frame_rate"}
_BOOLEANS = {"duration_exact"}

COLUMNS = metainfo.columns()
DTYPES = {
    c: "Int64" if c in _INTEGERS else "float64" if c in _FLOATS else "boolean" if c in _BOOLEANS else "string"
    for c in COLUMNS
}
RETRIES = 3


def _frame(rows):
    data = {c: pd.Series([r.get(c) for r in rows], dtype=DTYPES[c]) for c in COLUMNS}
    return pd.DataFrame(data, columns=COLUMNS)


def _flatten(report):
    row = {}
    for column in COLUMNS:
        value = report
        for key in column.split("."):
            value = value.get(key) if isinstance(value, dict) else None
        row[column] = len(value) if column == "pictures" and value is not None else value
    return row


def probe_rows(paths, probe=None):
    """The rows of a list of files, as a pandas DataFrame; never raises for a file."""
    probe = probe or metainfo.probe
    rows = []
    for path in paths:
        try:
            rows.append(_flatten(probe(path, strict=False)))
        except Exception as e:  # a file that fails otherwise is still a row
            rows.append({"path": os.fsdecode(path), "error": str(e) or type(e).__name__})
    return _frame(rows)


def _files_under(folder, device):
    """The regular files under folder, in name order, links not followed."""
    found = []
    try:
        entries = sorted(os.scandir(folder), key=lambda e: e.name)
    except OSError:
        return found
    for entry in entries:
        try:
            st = entry.stat(follow_symlinks=False)
        except OSError:
            continue
        if stat.S_ISDIR(st.st_mode):
            if st.st_dev == device:
                found.extend(_files_under(entry.path, device))
        elif stat.S_ISREG(st.st_mode):
            found.append(entry.path)
    return found


def _roots(paths):
    """Files named or directly in a named folder, and the subfolders to list (with their root's device)."""
    files, folders = [], []
    for path in paths:
        path = os.path.abspath(path)
        try:
            st = os.stat(path)
        except OSError:
            files.append(path)  # probed, so its error is a row
            continue
        if not stat.S_ISDIR(st.st_mode):
            files.append(path)
            continue
        for entry in sorted(os.scandir(path), key=lambda e: e.name):
            est = entry.stat(follow_symlinks=False)
            if stat.S_ISDIR(est.st_mode) and est.st_dev == st.st_dev:
                folders.append((entry.path, st.st_dev))
            elif stat.S_ISREG(est.st_mode):
                files.append(entry.path)
    return files, folders


def _list_files(paths, client):
    files, folders = _roots(paths)
    if folders:
        if client is not None:
            lists = client.gather(client.map(_files_under, *zip(*folders), retries=RETRIES, pure=False))
        else:
            import dask

            lists = dask.compute(*[dask.delayed(_files_under)(f, d) for f, d in folders])
        for found in lists:
            files.extend(found)
    return sorted(set(files))


def scan(paths, client=None, partition_size=500, probe=None):
    """One row per regular file under paths (folders or files), as a dask DataFrame.

    With a distributed Client (given, or the current one), the work is submitted
    at once, each partition with retries, and the DataFrame holds its futures.
    Without one, the DataFrame is lazy and runs on Dask's local scheduler.
    probe replaces metainfo.probe (it is called as probe(path, strict=False)).
    """
    import dask
    import dask.dataframe as dd

    if isinstance(paths, (str, bytes, os.PathLike)):
        paths = [paths]
    if client is None:
        try:
            from distributed import get_client

            client = get_client()
        except (ImportError, ValueError):
            client = None
    files = _list_files(paths, client)
    chunks = [files[i : i + partition_size] for i in range(0, len(files), partition_size)] or [[]]
    meta = _frame([])
    if client is not None:
        parts = client.map(probe_rows, chunks, probe=probe, retries=RETRIES, pure=False)
    else:
        parts = [dask.delayed(probe_rows)(chunk, probe) for chunk in chunks]
    return dd.from_delayed(parts, meta=meta, verify_meta=False)


def _write(frame, out):
    os.makedirs(out, exist_ok=True)
    try:
        import pyarrow  # noqa: F401

        frame.to_parquet(out, write_index=False)
        return "parquet"
    except ImportError:
        frame.to_csv(os.path.join(out, "part-*.csv"), index=False)
        return "csv"


def main(argv=None):
    parser = argparse.ArgumentParser(prog="python3 -m metainfo.dask", description="Scan folders on a Dask cluster.")
    parser.add_argument("scheduler", help="the scheduler's address (tcp://host:8786)")
    parser.add_argument("paths", nargs="+", help="folders or files, the same paths on every worker")
    parser.add_argument("--out", required=True, help="folder for the partitioned rows")
    parser.add_argument("--partition-size", type=int, default=500, help="files per task (default 500)")
    args = parser.parse_args(argv)

    import dask
    from distributed import Client

    import metainfo.dask as this  # tasks refer to the module by name, not to __main__

    with Client(args.scheduler) as client:
        frame = this.scan(args.paths, client=client, partition_size=args.partition_size)
        kind = _write(frame, args.out)
        count, errors = dask.compute(frame.shape[0], frame["error"].notnull().sum())
    print(f"{count} files, {errors} with errors, written as {kind} to {args.out}")
    return 0


if __name__ == "__main__":
    sys.exit(main())
