"""libmetainfo for Python: what a media file holds, without decoding it.

    probe(path, *, strict=True) -> dict   the keys of `metainfo probe --json`
    exact(path) -> dict                    the C interface's answers ('exact')
    cut(src, dst, start, end)              copies the audio between two times (s)
    cover(path, index=0) -> bytes          an embedded picture
    Error                                  not a media file, or a damaged one

A path the file system refuses raises FileNotFoundError, IsADirectoryError or
PermissionError. metainfo.dask scans folders on a Dask cluster.
"""

from ._core import Error, __version__, columns, cover, cut, exact, probe

__all__ = ["Error", "__version__", "columns", "cover", "cut", "exact", "probe"]
