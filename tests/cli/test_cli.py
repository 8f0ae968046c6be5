"""The metainfo program as users meet it: arguments, exit codes, messages and
output that other tools parse. Run by ctest with the program's path in
METAINFO_BIN (and METAINFO_SAMPLES, METAINFO_CORPUS, METAINFO_SEEDS,
METAINFO_VERSION)."""
import csv
import io
import json
import os
import shutil
import struct
import subprocess

import pytest

BIN = os.environ["METAINFO_BIN"]
SAMPLES = os.environ["METAINFO_SAMPLES"]
CORPUS = os.environ.get("METAINFO_CORPUS", "")
SEEDS = os.environ.get("METAINFO_SEEDS", "")
VERSION = os.environ["METAINFO_VERSION"]
MP3 = os.path.join(SAMPLES, "silence.mp3")


def run(args, stdin=None):
    return subprocess.run([BIN] + args, input=stdin, capture_output=True, timeout=120)


def syncsafe(n):
    return bytes([(n >> 21) & 0x7F, (n >> 14) & 0x7F, (n >> 7) & 0x7F, n & 0x7F])


def with_cover(path, picture):
    """An ID3v2.3 tag with one APIC frame and padding (the C interface reads no
    frame of a tag without padding), then the sample's MPEG frames."""
    body = b"\x00image/png\x00\x03\x00" + picture
    frame = b"APIC" + struct.pack(">I", len(body)) + b"\x00\x00" + body
    audio = open(MP3, "rb").read()
    if audio[:3] == b"ID3":
        size = (audio[6] << 21) | (audio[7] << 14) | (audio[8] << 7) | audio[9]
        audio = audio[10 + size:]
    with open(path, "wb") as f:
        f.write(b"ID3\x03\x00\x00" + syncsafe(len(frame) + 64) + frame + bytes(64) + audio)


@pytest.fixture(scope="module")
def files(tmp_path_factory):
    d = tmp_path_factory.mktemp("cli")
    (d / "empty.mp3").write_bytes(b"")
    (d / "text.txt").write_text("not media\n")
    (d / "cut.wav").write_bytes(b"RIFF" + struct.pack("<I", 1000) + b"WAVEfmt " + struct.pack("<I", 16) + b"\x01\x00")
    (d / "folder").mkdir()
    locked = d / "locked.mp3"
    locked.write_bytes(open(MP3, "rb").read())
    locked.chmod(0)
    png = b"\x89PNG\r\n\x1a\n" + bytes(range(64))
    with_cover(str(d / "cover.mp3"), png)
    return {"dir": d, "png": png}


# (arguments, exit status, pattern of standard error, text standard output holds)
CASES = [
    (["--help"], 0, "", "Exit status"),
    (["--version"], 0, "", "metainfo " + VERSION),
    (["probe", "--help"], 0, "", "--json"),
    (["probe", MP3], 0, "", "media type: 1 (mp3)"),
    (["probe", "{dir}/missing.mp3"], 1, "missing.mp3: no such file", ""),
    (["probe", "{dir}/folder"], 1, "folder: is a directory", ""),
    (["probe", "{dir}/empty.mp3"], 1, "empty.mp3: empty", ""),
    (["probe", "{dir}/text.txt"], 1, r"text.txt: not a media file \(0x80004005\)", ""),
    (["probe", MP3, "{dir}/missing.mp3"], 1, "no such file", "media type: 1"),
    (["probe", "{dir}/cut.wav"], 1, r"cut.wav: damaged or truncated \(clip information 0x80004005\)", "media type"),
    (["probe"], 2, "required", ""),
    (["probe", "--bogus", MP3], 2, "--bogus", ""),
    (["probe", "--json", "--csv", MP3], 2, "excludes", ""),
    (["nothing"], 2, "", ""),
    (["cut", "--exact", MP3, "1.5", "2", "{dir}/cut.mp3"], 2, "whole seconds", ""),
    (["cut", MP3, "0.5", "0:00.900", "{dir}/cut.mp3"], 0, "", "written to"),
    (["cut", MP3, "100", "200", "{dir}/cut.mp3"], 1, "nothing plays in that range", ""),
    (["cut", MP3, "abc", "2", "{dir}/cut.mp3"], 2, "not a time: abc", ""),
    (["cut", MP3, "-1", "2", "{dir}/cut.mp3"], 2, "", ""),
    (["cut", MP3, "0:61", "2", "{dir}/cut.mp3"], 2, "not a time", ""),
    (["cut", MP3, "2", "1", "{dir}/cut.mp3"], 2, "after the start", ""),
    (["cut", MP3, "0", "0:01.000", "{dir}/cut.mp3"], 0, "", "written to"),
    (["cut", "{dir}/text.txt", "0", "1", "{dir}/cut.mp3"], 1, "not MP3, ADTS AAC, WAVE or AMR", ""),
    (["cut", "--exact", "{dir}/text.txt", "0", "1", "{dir}/cut.mp3"], 1, "not a media file", ""),
    (["frames", "x.avi", "--stream", "1.5"], 2, "", ""),
    (["frames", "{dir}/text.txt"], 1, "not a readable AVI file", ""),
    (["maker", MP3], 1, "no maker box", ""),
    (["cover", "{dir}/cover.mp3", "-o", "{dir}/out.png"], 0, "", "written to"),
    (["cover", "{dir}/cover.mp3", "--index", "1"], 1, "no picture 1", ""),
    (["cover", "{dir}/cover.mp3", "--exact", "-o", "{dir}/exact.png"], 0, "", "written to"),
    (["cover", MP3], 1, "no picture", ""),
]


@pytest.mark.parametrize("args,status,stderr,stdout", CASES, ids=[" ".join(c[0])[-60:] for c in CASES])
def test_case(files, args, status, stderr, stdout):
    import re
    args = [a.replace("{dir}", str(files["dir"])) for a in args]
    r = run(args)
    assert r.returncode == status, r.stderr.decode(errors="replace")
    assert re.search(stderr, r.stderr.decode(errors="replace")), r.stderr
    assert stdout in r.stdout.decode(errors="replace")


def test_unreadable_file_says_permission_denied(files):
    if os.geteuid() == 0:
        pytest.skip("running as root: every file is readable")
    r = run(["probe", str(files["dir"] / "locked.mp3")])
    assert r.returncode == 1 and b"permission denied" in r.stderr


def test_cover_writes_the_picture_bytes(files):
    out = files["dir"] / "written.png"
    assert run(["cover", str(files["dir"] / "cover.mp3"), "-o", str(out)]).returncode == 0
    assert out.read_bytes() == files["png"]
    if shutil.which("ffmpeg"):  # a FLAC PICTURE block, which only the accurate answers read
        flac, png = files["dir"] / "cover.flac", files["dir"] / "red.png"
        ff = ["ffmpeg", "-loglevel", "error", "-f", "lavfi", "-i"]
        subprocess.run(ff + ["color=red:size=8x8", "-frames:v", "1", str(png)], check=True)
        subprocess.run(ff + ["sine=d=1", "-i", str(png), "-map", "0", "-map", "1", "-c:v", "copy", "-disposition:v",
                             "attached_pic", str(flac)], check=True)
        assert run(["cover", str(flac), "--all", "-o", str(files["dir"] / "flac.png")]).returncode == 0
        assert (files["dir"] / "flac-0.png").read_bytes() == png.read_bytes()
        assert b"no picture" in run(["cover", str(flac), "--exact"]).stderr
    line = json.loads(run(["probe", "--json", str(files["dir"] / "cover.mp3")]).stdout)
    assert line["pictures"] == [{"mime": "image/png", "type": 3, "description": None, "size": len(files["png"])}]


def test_names_from_stdin_and_not_utf8(files):
    odd = files["dir"] / b"caf\xe9.mp3".decode("utf-8", "surrogateescape")
    odd.write_bytes(open(MP3, "rb").read())
    names = b"\0".join([MP3.encode(), os.fsencode(str(odd))]) + b"\0"
    r = run(["probe", "--json", "-0", "-"], stdin=names)
    assert r.returncode == 0, r.stderr
    lines = [json.loads(l) for l in r.stdout.decode("utf-8").splitlines()]
    assert [l["format"] for l in lines] == ["mp3", "mp3"]
    assert lines[1]["path_bytes"] == os.fsencode(str(odd)).hex()
    assert lines[0]["path_bytes"] is None


KEYS = ["path", "path_bytes", "size", "format", "mime", "duration", "duration_exact", "bit_rate", "creation_time", "audio",
        "video", "tags", "pictures", "maker", "error", "exact"]
TAGS = ["title", "artist", "album", "album_artist", "genre", "date", "year", "track", "track_total", "disc",
        "disc_total", "comment", "composer", "other"]


def folders():
    found = [SAMPLES]
    if CORPUS and os.path.isdir(CORPUS):
        found.append(CORPUS)
    return found


def check_types(line):
    assert list(line) == KEYS
    assert isinstance(line["path"], str)
    for key in ("size", "bit_rate"):
        assert line[key] is None or (isinstance(line[key], int) and line[key] > 0 or key == "size")
    assert line["duration"] is None or line["duration"] > 0
    assert line["error"] is None or isinstance(line["error"], str)
    if line["error"] is None:
        assert isinstance(line["format"], str) and list(line["tags"]) == TAGS
    for part in ("audio", "video"):
        if line[part] is not None:
            for k, v in line[part].items():
                assert v is None or isinstance(v, (int, float, str)), (k, v)
                assert v != 0 and v != "", (part, k)
    tags = dict(line["tags"] or {})
    assert all(isinstance(v, str) and v for v in tags.pop("other", {}).values())
    for k, v in tags.items():
        assert v is None or (isinstance(v, (int, str)) and v != "" and v == (v.strip() if isinstance(v, str) else v))
        if isinstance(v, str):
            assert not any(ord(c) < 0x20 for c in v), (k, v)


def test_json_lines_over_samples_fixtures_and_corpus(tmp_path):
    roots = folders()
    if SEEDS and os.path.exists(SEEDS):
        subprocess.run([SEEDS, str(tmp_path / "seeds")], capture_output=True, check=True)
        roots.append(str(tmp_path / "seeds"))
    r = run(["probe", "-r", "--json"] + roots)
    assert r.returncode in (0, 1)
    text = r.stdout.decode("utf-8")  # valid UTF-8 or this raises
    lines = [json.loads(l) for l in text.splitlines()]
    assert len(lines) >= 8
    for line in lines:
        check_types(line)
    assert sum(1 for l in lines if l["error"] is None) >= 8


def test_csv_has_a_header_and_one_row_a_file():
    r = run(["probe", "-r", "--csv"] + folders())
    rows = list(csv.reader(io.StringIO(r.stdout.decode("utf-8"), newline="")))
    assert rows[0][:4] == ["path", "path_bytes", "size", "format"]
    assert all(len(row) == len(rows[0]) for row in rows)
    names = [os.path.join(dp, f) for root in folders() for dp, _, fs in os.walk(root) for f in fs]
    assert len(rows) - 1 == len(names)
