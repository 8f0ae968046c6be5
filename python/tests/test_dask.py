import functools
import os
import shutil
import subprocess
import sys

import pandas as pd
import pytest

import metainfo
from conftest import CORPUS, PROGRAM, SAMPLES

distributed = pytest.importorskip("distributed")
import cloudpickle  # noqa: E402

import metainfo.dask  # noqa: E402

cloudpickle.register_pickle_by_value(sys.modules[__name__])  # the workers cannot import this file
COMPARED = ["path", "format", "duration", "audio.codec", "video.codec"]


@pytest.fixture(scope="module")
def client():
    with distributed.LocalCluster(n_workers=2, processes=True, threads_per_worker=1, dashboard_address=":0") as cluster:
        with distributed.Client(cluster) as c:
            yield c


@pytest.fixture(scope="module")
def tree(tmp_path_factory):
    root = tmp_path_factory.mktemp("tree")
    for i, path in enumerate(SAMPLES + CORPUS):
        folder = root / f"d{i % 3}" / ("deep" if i % 5 == 0 else "")
        folder.mkdir(parents=True, exist_ok=True)
        shutil.copy(path, folder / os.path.basename(path))
    (root / "top.mp3").write_bytes(open(SAMPLES[0], "rb").read())
    (root / "d0" / "text.mp3").write_text("not media\n")
    (root / "d1" / "empty.wav").write_bytes(b"")
    return str(root)


def count(tree):
    return sum(len(files) for _, _, files in os.walk(tree))


def program_rows(tree, tmp_path):
    db = str(tmp_path / "scan.db")
    subprocess.run([PROGRAM, "scan", tree, "--db", db], capture_output=True, check=False)
    out = subprocess.run([PROGRAM, "export", "--db", db, "--csv"], capture_output=True, check=True)
    (tmp_path / "export.csv").write_bytes(out.stdout)
    return pd.read_csv(tmp_path / "export.csv", float_precision="round_trip", keep_default_na=False, na_values=[""])


def records(frame):
    frame = frame.sort_values("path")
    return [tuple(None if pd.isna(v) else v for v in row) for row in frame[COMPARED].itertuples(index=False)]


def test_scan_gives_the_program_s_rows(client, tree, tmp_path):
    # Partitions of a quarter of the tree, however many files the corpus adds.
    frame = metainfo.dask.scan(tree, client=client, partition_size=max(1, count(tree) // 4))
    assert frame.npartitions > 2
    rows = frame.compute()
    assert list(rows.columns) == metainfo.columns()
    assert dict(rows.dtypes.astype(str)) == metainfo.dask.DTYPES
    expected = program_rows(tree, tmp_path)
    assert records(rows) == records(expected)
    failed = [set(f.loc[f["error"].notna(), "path"]) for f in (rows, expected)]
    assert failed[0] == failed[1] and any(p.endswith("text.mp3") for p in failed[0])


def crash_once(marker, victim, path, strict):
    if path.endswith(victim) and not os.path.exists(marker):
        open(marker, "w").close()
        os._exit(1)  # the worker process dies mid-task
    return metainfo.probe(path, strict=strict)


def test_a_worker_dying_mid_scan_loses_no_row(client, tree, tmp_path):
    marker = str(tmp_path / "crashed")
    victim = os.path.basename(SAMPLES[-1])
    probe = functools.partial(crash_once, marker, victim)
    rows = metainfo.dask.scan(tree, client=client, partition_size=8, probe=probe).compute()
    assert os.path.exists(marker)
    alone = metainfo.dask.probe_rows(sorted(rows["path"]))
    assert records(rows) == records(alone) and len(rows) == count(tree)


def test_command_writes_every_row(client, tree, tmp_path):
    out = str(tmp_path / "out")
    size = str(max(1, count(tree) // 3))
    metainfo.dask.main([client.scheduler.address, tree, "--out", out, "--partition-size", size])
    parts = [pd.read_csv(os.path.join(out, name)) for name in sorted(os.listdir(out))]
    assert len(parts) > 1 and sum(len(p) for p in parts) == count(tree)
