"""copy_page.py SOURCE TARGET: copies the files of a built page, and a compressed form X.gz beside each large file X.

Answers up to 1 KiB are not compressed, as everywhere in the server; index.html is such an answer. The same files give the
same bytes on every machine of one version of zlib.
"""

import gzip
import pathlib
import shutil
import sys

LARGEST_PLAIN = 1024  # bytes


def copy(source, target):
    shutil.rmtree(target, ignore_errors=True)
    shutil.copytree(source, target)
    for path in [path for path in target.rglob("*") if path.is_file() and path.stat().st_size > LARGEST_PLAIN]:
        packed = gzip.compress(path.read_bytes(), compresslevel=9, mtime=0)
        path.with_name(path.name + ".gz").write_bytes(packed)


if __name__ == "__main__":
    copy(pathlib.Path(sys.argv[1]), pathlib.Path(sys.argv[2]))
