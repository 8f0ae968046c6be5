"""metainfo scan and export: a library database kept up to date by rescans, safe to kill, one writer at a time.
Run by ctest with the program in METAINFO_BIN (and METAINFO_SAMPLES, METAINFO_SEEDS)."""
import csv
import fcntl
import io
import json
import os
import pty
import re
import shutil
import signal
import sqlite3
import subprocess
import time

import pytest

from test_cli import with_cover

BIN = os.environ["METAINFO_BIN"]
SAMPLES = os.environ["METAINFO_SAMPLES"]
SEEDS = os.environ.get("METAINFO_SEEDS", "")
SUMMARY = re.compile(rb"metainfo: scan: (\d+) new, (\d+) changed, (\d+) unchanged, (\d+) moved, (\d+) removed, "
                     rb"(\d+) failed, [0-9.]+ s\n")
COUNTS = ["new", "changed", "unchanged", "moved", "removed", "failed"]


def run(args, **kw):
    return subprocess.run([BIN] + args, capture_output=True, timeout=120, **kw)


def scan(root, db, *extra):
    r = run(["scan", str(root), "--db", str(db)] + list(extra))
    assert r.returncode == 0, r.stderr
    m = SUMMARY.fullmatch(r.stderr)
    assert m, r.stderr  # the summary and nothing else without a terminal
    return dict(zip(COUNTS, map(int, m.groups()))), r


def rows(db):
    with sqlite3.connect(db) as c:
        return {bytes(p).decode(errors="surrogateescape"): (i, s, e)
                for i, p, s, e in c.execute("SELECT id, path, size, error FROM files")}


def tree(base, copies=1):
    """The samples (copies times over) and, when built, the fuzzing seeds."""
    for n in range(copies):
        shutil.copytree(SAMPLES, base / f"samples{n}")
    if SEEDS and os.path.exists(SEEDS):
        subprocess.run([SEEDS, str(base / "seeds")], capture_output=True, check=True)
    return sorted(os.path.join(d, f) for d, _, fs in os.walk(base) for f in fs)


def retag(p):
    with open(p, "ab") as f:
        f.write(b"TAG" + b"retagged".ljust(125, b"\0"))


# (what happens to the tree, the counts of the rescan that follows)
STEPS = [
    ("nothing", lambda d: None, dict(new=0, changed=0, moved=0, removed=0)),
    ("retag", lambda d: retag(d / "samples0/silence.mp3"), dict(new=0, changed=1, moved=0, removed=0)),
    ("add", lambda d: shutil.copy(d / "samples0/tone.wav", d / "new.wav"), dict(new=1, changed=0, moved=0, removed=0)),
    ("rename", lambda d: os.rename(d / "new.wav", d / "samples0/renamed.wav"), dict(new=0, changed=0, moved=1)),
    ("move a folder", lambda d: os.rename(d / "samples0", d / "moved"), dict(new=0, changed=0, moved=9, removed=0)),
    ("remove", lambda d: os.remove(d / "moved/note.mid"), dict(new=0, changed=0, moved=0, removed=1)),
    ("link a folder", lambda d: os.symlink(d / "moved", d / "link"), dict(new=0, changed=0, moved=0, removed=0)),
]


def test_rescans_follow_the_tree(tmp_path):
    root, db = tmp_path / "lib", tmp_path / "lib.db"
    root.mkdir()
    tree(root)
    counts, _ = scan(root, db)
    assert counts["new"] == len(rows(db)) >= 8
    for name, change, expected in STEPS:
        before = rows(db)
        change(root)
        counts, _ = scan(root, db)
        assert {k: counts[k] for k in expected} == expected, name
        after = rows(db)
        assert sorted(after) == tree_names(root), name
        assert counts["unchanged"] == len(set(before) & set(after)) - counts["changed"], name
        if counts["moved"]:  # the same rows under their new names
            assert sorted(i for i, _, _ in after.values()) == sorted(i for i, _, _ in before.values()), name
    assert scan(root, db, "--follow")[0]["new"] == 8  # the linked folder's files, once followed
    assert scan(root, db, "--full")[0]["changed"] == len(rows(db))


def tree_names(root):
    return sorted(os.path.join(d, f) for d, _, fs in os.walk(root) for f in fs)


# (file contents, the reason stored: what probe says on standard error)
BAD = [(b"", "empty"), (b"not media\n", r"not a media file \(0x80004005\)"),
       (b"RIFF\xe8\x03\0\0WAVEfmt \x10\0\0\0\x01\0", r"damaged or truncated \(clip information 0x80004005\)")]


def test_files_that_fail_get_their_reason_and_the_scan_goes_on(tmp_path):
    shutil.copy(os.path.join(SAMPLES, "silence.mp3"), tmp_path / "good.mp3")
    for n, (content, _) in enumerate(BAD):
        (tmp_path / f"bad{n}.wav").write_bytes(content)
    counts, _ = scan(tmp_path, tmp_path / "x.db")
    assert counts["failed"] == len(BAD) and counts["new"] == len(BAD) + 1
    found = rows(tmp_path / "x.db")
    for n, (_, reason) in enumerate(BAD):
        path = str(tmp_path / f"bad{n}.wav")
        assert re.fullmatch(reason, found[path][2])
        assert re.search(reason, run(["probe", path]).stderr.decode())
    assert found[str(tmp_path / "good.mp3")][2] is None


# Formats only the accurate answers read: (file, ffmpeg arguments, format, codecs)
OTHER_FORMATS = [
    ("a.flac", ["-f", "lavfi", "-i", "sine=d=1"], "flac", ["flac"]),
    ("a.opus", ["-f", "lavfi", "-i", "sine=d=1", "-c:a", "libopus"], "ogg", ["opus"]),
    ("a.mkv", ["-f", "lavfi", "-i", "testsrc=d=1:s=64x48", "-f", "lavfi", "-i", "sine=d=1", "-c:v", "libx264",
               "-c:a", "aac"], "matroska", ["h264", "aac"]),
    ("a.aiff", ["-f", "lavfi", "-i", "sine=d=1"], "aiff", ["pcm_s16be"]),
]


@pytest.mark.skipif(not shutil.which("ffmpeg"), reason="ffmpeg makes the files")
def test_formats_beyond_the_contract_are_scanned(tmp_path):
    for name, args, _, _ in OTHER_FORMATS:
        subprocess.run(["ffmpeg", "-loglevel", "error"] + args + ["-metadata", "title=T " + name, str(tmp_path / name)],
                       check=True, timeout=120)
    assert scan(tmp_path, tmp_path / "x.db")[0]["failed"] == 0
    with sqlite3.connect(tmp_path / "x.db") as c:
        found = {os.path.basename(bytes(p).decode()): (f, json.loads(s), e)
                 for p, f, s, e in c.execute("SELECT path, format, streams, error FROM files")}
        titles = dict(c.execute("SELECT value, key FROM tags WHERE key = 'title'"))
    for name, _, fmt, codecs in OTHER_FORMATS:
        assert found[name][0] == fmt and found[name][2] is None, name
        assert sorted(s["codec"] for s in found[name][1]) == sorted(codecs), name
        assert "T " + name in titles, name


def test_export_writes_what_probe_writes(tmp_path):
    root = tmp_path / "lib"
    root.mkdir()
    names = tree(root)
    with_cover(str(root / "cover.mp3"), b"\x89PNG\r\n\x1a\n" + bytes(range(40)))
    odd = os.path.join(str(root), b"caf\xe9.mp3".decode(errors="surrogateescape"))
    shutil.copy(os.path.join(SAMPLES, "silence.mp3"), odd)
    names = sorted(names + [str(root / "cover.mp3"), odd], key=os.fsencode)
    db = tmp_path / "lib.db"
    _, r = scan(root, db, "--json", "--pictures", "-j", "3")
    exported = run(["export", "--db", str(db), "--json"])
    assert exported.returncode == 0
    lines = [json.loads(l) for l in exported.stdout.decode().splitlines()]
    assert [l["path"] for l in lines] == [n.encode(errors="surrogateescape").decode(errors="replace") for n in names]
    scanned = {l["path"]: l for l in map(json.loads, r.stdout.decode().splitlines())}
    assert [scanned[l["path"]] for l in lines] == lines and len(scanned) == len(lines)
    # A QCP parse leaves state for the next one on its thread: those answers depend on the order probed.
    alike = [n for n in names if not n.endswith(".qcp")]
    probed = [json.loads(l) for l in run(["probe", "--json"] + alike).stdout.decode().splitlines()]
    assert [l for l in lines if not l["path"].endswith(".qcp")] == probed
    names = alike
    csv_rows = [list(csv.reader(io.StringIO(run(args).stdout.decode(), newline=""))) for args in
                (["export", "--db", str(db), "--csv"], ["probe", "--csv"] + names)]
    csv_rows[0] = [row for row in csv_rows[0] if not row[0].endswith(".qcp")]
    assert csv_rows[0] == csv_rows[1] and len(csv_rows[0]) == len(names) + 1
    with sqlite3.connect(db) as c:
        assert c.execute("SELECT data FROM pictures JOIN files ON id = file_id WHERE path = ?",
                         (os.fsencode(str(root / "cover.mp3")),)).fetchall() == [(b"\x89PNG\r\n\x1a\n" + bytes(range(40)),)]
        assert c.execute("SELECT count(*) FROM pictures WHERE length(data) IS NOT size").fetchone() == (0,)
    assert run(["export", "--db", str(db)]).returncode == 2
    assert b"DB:" in run(["export", "--db", str(tmp_path / "none.db"), "--json"]).stderr


def test_a_killed_scan_leaves_a_sound_database(tmp_path):
    root, db = tmp_path / "lib", tmp_path / "lib.db"
    root.mkdir()
    names = tree(root, copies=80)
    kept = 0
    for delay in (0.005, 0.01, 0.02, 0.04, 0.08, 0.15):
        p = subprocess.Popen([BIN, "scan", str(root), "--db", str(db), "-j", "1", "--full"],
                             stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        time.sleep(delay)
        p.send_signal(signal.SIGKILL)
        p.wait()
        if os.path.exists(db):
            with sqlite3.connect(db) as c:
                assert c.execute("PRAGMA integrity_check").fetchall() == [("ok",)]
                made = c.execute("SELECT count(*) FROM sqlite_master WHERE name = 'files'").fetchone()[0]
                count = c.execute("SELECT count(*) FROM files").fetchone()[0] if made else 0
            assert count >= kept  # committed rows stay
            kept = count
    counts, _ = scan(root, db)
    assert counts["new"] + counts["unchanged"] + counts["changed"] == len(names)
    assert sorted(rows(db)) == names


def test_one_scan_writes_at_a_time(tmp_path):
    db = tmp_path / "x.db"
    shutil.copy(os.path.join(SAMPLES, "silence.mp3"), tmp_path / "a.mp3")
    with open(str(db) + ".lock", "w") as held:  # as a scan running holds it
        fcntl.flock(held, fcntl.LOCK_EX)
        start = time.monotonic()
        refused = run(["scan", str(tmp_path), "--db", str(db), "--wait", "0.5"])
        assert refused.returncode == 1 and time.monotonic() - start >= 0.5
        assert b"metainfo: DB: another scan is writing it" in refused.stderr
        waiting = subprocess.Popen([BIN, "scan", str(tmp_path), "--db", str(db), "--wait", "30"],
                                   stderr=subprocess.PIPE)
        time.sleep(0.3)
        assert waiting.poll() is None
    assert waiting.wait(timeout=60) == 0 and b"1 new" in waiting.stderr.read()
    with open(str(db) + ".lock", "w") as stale:
        stale.write("999999999\n")  # the pid of a scan long dead: its lock went with it
    assert scan(tmp_path, db)[0]["unchanged"] == 1


def test_progress_line_only_on_a_terminal(tmp_path):
    tree(tmp_path / "lib")
    master, slave = pty.openpty()
    p = subprocess.Popen([BIN, "scan", str(tmp_path / "lib"), "--db", str(tmp_path / "x.db")], stderr=slave)
    os.close(slave)
    out = b""
    while True:
        try:
            chunk = os.read(master, 4096)
        except OSError:
            break
        if not chunk:
            break
        out += chunk
    assert p.wait() == 0
    os.close(master)
    assert re.search(rb"\r\x1b\[K\d+/\d+ files, \d+ files/s, \S*lib", out), out
    assert SUMMARY.search(out.replace(b"\r\n", b"\n"))
    assert b"\r" not in scan(tmp_path / "lib", tmp_path / "x.db")[1].stderr


def test_a_version_0_database_is_upgraded(tmp_path):
    song = tmp_path / "song.mp3"
    shutil.copy(os.path.join(SAMPLES, "silence.mp3"), song)
    db = tmp_path / "old.db"
    with sqlite3.connect(db) as c:  # the first layout: no version, no pictures, no C interface answers
        c.executescript("""CREATE TABLE files(id INTEGER PRIMARY KEY, path BLOB NOT NULL UNIQUE, size INTEGER,
            mtime_ns INTEGER, inode INTEGER, device INTEGER, format TEXT, mime TEXT, duration_ms INTEGER,
            duration_exact INTEGER, bit_rate INTEGER, streams TEXT, error TEXT, scanned_at INTEGER);
            CREATE TABLE tags(file_id INTEGER NOT NULL, key TEXT NOT NULL, value TEXT);""")
        st = os.stat(song)
        c.execute("INSERT INTO files VALUES(7, ?, ?, ?, ?, ?, 'mp3', NULL, NULL, NULL, NULL, '[]', NULL, 0)",
                  (os.fsencode(str(song)), st.st_size, st.st_mtime_ns, st.st_ino, st.st_dev))
        c.execute("INSERT INTO tags VALUES(7, 'title', 'old')")
    counts, _ = scan(tmp_path, db)
    assert counts["changed"] == 1 and counts["new"] == 0  # probed again to fill what version 0 lacked
    with sqlite3.connect(db) as c:
        assert c.execute("SELECT version FROM schema_version").fetchall() == [(1,)]
        assert c.execute("SELECT id, path_text, exact IS NOT NULL FROM files").fetchall() == [(7, str(song), 1)]
        c.execute("UPDATE schema_version SET version = 99")
    newer = run(["scan", str(tmp_path), "--db", str(db)])
    assert newer.returncode == 1 and b"newer metainfo" in newer.stderr
