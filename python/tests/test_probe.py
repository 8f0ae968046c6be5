import concurrent.futures
import json
import os
import re
import shutil
import subprocess

import pytest

import metainfo
from conftest import CORPUS, PROGRAM, ROOT, SAMPLES


def program_reports(paths):
    out = subprocess.run([PROGRAM, "probe", "--json", *paths], capture_output=True, text=True).stdout
    return [json.loads(line) for line in out.splitlines()]


def test_version_is_the_library_s():
    header = (ROOT / "include/metainfo/version.h").read_text()
    assert metainfo.__version__ == re.search(r'MM_VERSION_STRING "([0-9.]+)"', header)[1]


@pytest.fixture(scope="module")
def other_formats(tmp_path_factory):
    """FLAC, Ogg Opus, Matroska and AIFF: formats only the accurate answers read."""
    if not shutil.which("ffmpeg"):
        pytest.skip("ffmpeg makes the files")
    d = tmp_path_factory.mktemp("formats")
    tone = ["-f", "lavfi", "-i", "sine=d=1", "-metadata", "title=T"]
    for name, extra in (("a.flac", []), ("a.opus", ["-c:a", "libopus"]), ("a.aiff", []), ("a.mka", ["-c:a", "aac"])):
        subprocess.run(["ffmpeg", "-loglevel", "error", *tone, *extra, str(d / name)], check=True)
    return sorted(str(p) for p in d.iterdir())


@pytest.mark.parametrize("group", ["samples", "corpus", "other_formats"])
def test_probe_gives_the_program_s_keys_and_values(group, request):
    paths = SAMPLES if group == "samples" else request.getfixturevalue(group)
    for path, expected in zip(paths, program_reports(paths), strict=True):
        assert metainfo.probe(path, strict=False) == expected, path
        if expected["error"] is None:
            assert metainfo.probe(path) == expected
            assert metainfo.exact(path) == expected["exact"]
        else:
            with pytest.raises((metainfo.Error, OSError), match=re.escape(expected["error"])):
                metainfo.probe(path)


def test_threads_answer_as_one_thread():
    paths = (SAMPLES + CORPUS) * 4
    alone = [metainfo.probe(p, strict=False) for p in paths]
    with concurrent.futures.ThreadPoolExecutor(4) as pool:
        assert list(pool.map(lambda p: metainfo.probe(p, strict=False), paths)) == alone


def cut_from(path):
    metainfo.cut(path, os.path.join(os.path.dirname(path), "out.mp3"), 0, 0.5)


@pytest.mark.parametrize("call", [metainfo.probe, metainfo.exact, metainfo.cover, cut_from])
@pytest.mark.parametrize(
    "make, error, reason",
    [
        (lambda d: d / "missing.mp3", FileNotFoundError, "no such file"),
        (lambda d: d, IsADirectoryError, "is a directory"),
        (lambda d: write(d / "text.mp3", b"plain text, not a media file\n", 0o644), metainfo.Error, "not"),
        (lambda d: write(d / "locked.mp3", open(SAMPLES[0], "rb").read(), 0), PermissionError, "permission"),
    ],
)
def test_errors(call, make, error, reason, tmp_path):
    if error is PermissionError and os.geteuid() == 0:
        pytest.skip("root reads every file")
    with pytest.raises(error, match=reason):
        call(str(make(tmp_path)))


def write(path, data, mode):
    path.write_bytes(data)
    path.chmod(mode)
    return path


def test_cut(tmp_path):
    src = os.path.join(ROOT, "samples", "silence.mp3")
    out = str(tmp_path / "cut.mp3")
    metainfo.cut(src, out, 0.25, 0.75)
    report = metainfo.probe(out)
    assert report["format"] == "mp3" and 0.4 <= report["duration"] <= 0.6
    with pytest.raises(ValueError):
        metainfo.cut(src, out, 0.5, 0.5)
    assert issubclass(metainfo.Error, Exception) and not issubclass(metainfo.Error, OSError)
    with pytest.raises(metainfo.Error):
        metainfo.cut(os.path.join(ROOT, "samples", "note.mid"), out, 0, 0.5)


def test_cover(corpus):
    path, report = next((p, r) for p in corpus if (r := metainfo.probe(p, strict=False))["pictures"])
    picture = metainfo.cover(path)
    assert len(picture) == report["pictures"][0]["size"]
    magic = {"image/jpeg": b"\xff\xd8", "image/png": b"\x89PNG"}.get(report["pictures"][0]["mime"], b"")
    assert picture.startswith(magic)
    with pytest.raises(IndexError):
        metainfo.cover(path, len(report["pictures"]))
