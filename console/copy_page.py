"""copy_page.py SOURCE TARGET: copies the files of a built page, and a compressed form X.gz of each file X beside it.

The same files give the same bytes on every machine of one version of zlib.
"""

import gzip
import pathlib
import shutil
import sys


def copy(source, target):
    shutil.rmtree(target, ignore_errors=True)
    shutil.copytree(source, target)
    for path in [path for path in target.rglob("*") if path.is_file()]:
        packed = gzip.compress(path.read_bytes(), compresslevel=9, mtime=0)
        path.with_name(path.name + ".gz").write_bytes(packed)


if __name__ == "__main__":
    copy(pathlib.Path(sys.argv[1]), pathlib.Path(sys.argv[2]))
