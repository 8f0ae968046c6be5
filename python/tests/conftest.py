import os
import pathlib

import pytest

ROOT = pathlib.Path(os.environ.get("METAINFO_SOURCE", pathlib.Path(__file__).resolve().parents[2]))
PROGRAM = os.environ.get("METAINFO_PROGRAM", str(ROOT / "build" / "metainfo"))
CORPUS_DIR = ROOT.parent / "shared" / "corpus"
SAMPLES = sorted(str(p) for p in (ROOT / "samples").iterdir() if p.is_file())
CORPUS = sorted(str(p) for p in CORPUS_DIR.rglob("*") if p.is_file()) if CORPUS_DIR.is_dir() else []


@pytest.fixture
def corpus():
    if not CORPUS:
        pytest.skip(f"no corpus at {CORPUS_DIR}")
    return CORPUS
