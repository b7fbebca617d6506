"""An administrator's slip in /etc/exports, above all other lines: nobody else loses anything by it."""

import os
import pathlib

import pytest

from harness import api

EXPORTS = pathlib.Path("/etc/exports")

SLIPS = {
    "an option that does not exist": "/srv/slip *(rw,no_such_option)\n",
    "an empty sec=": "/srv/slip *(rw,sec=)\n",
    "a flavour that does not exist": "/srv/slip *(rw,sec=krb7)\n",
    "a missing bracket": "/srv/slip *(rw\n",
    "an open quote": "\"/srv/slip *(rw)\n",
    "a path without a slash": "srv/slip *(rw)\n",
    "a folder that does not exist": "/srv/no-such-folder *(rw,no_subtree_check)\n",
    "a host that does not exist": "/srv/slip no-such-host.lab.test(rw,no_subtree_check)\n",
    "a line without clients": "/srv/slip\n",
    "a bad number": "/srv/slip *(rw,anonuid=many)\n",
}
EXPORTFS_STOPS_AT = {"an option that does not exist", "a flavour that does not exist", "a missing bracket",
                     "an open quote", "a bad number", "an empty sec="}


# The kernel server's programs and vornd complain about the faulty line itself.
_COMPLAINTS = "^exportfs: |^vornd: |^rpc.mountd: No host name given with /srv/slip"


def write_on_top(line):
    EXPORTS.write_text(line + EXPORTS.read_text(encoding="utf-8"), encoding="utf-8")


@pytest.mark.parametrize("slip", SLIPS)
def test_a_save_beside_a_faulty_line_takes_nothing_from_anybody(box, client, other, slip):
    box.foresees(_COMPLAINTS)
    pathlib.Path("/srv/slip").mkdir(exist_ok=True)
    box.share("data")
    box.share("another")
    box.allow("data", {"client": client.address})
    with client.mounted("/srv/data") as mounted, open(mounted / "file", "wb", buffering=0) as file:
        write_on_top(SLIPS[slip])
        box.allow("another", {"client": other.address})
        os.write(file.fileno(), b"x")
        os.fsync(file.fileno())
    assert client.mounts("/srv/data")
    assert other.mounts("/srv/another"), "a save was answered with success, and the share is not served"


@pytest.mark.parametrize("slip", sorted(EXPORTFS_STOPS_AT))
def test_the_answer_and_the_log_name_the_faulty_line(box, client, slip):
    box.foresees(_COMPLAINTS)
    box.share("data")
    write_on_top(SLIPS[slip])
    answer = api.answer("NFS.SharePrivilege", "save", share_name="data", rule=[box.rule(client=client.address)])
    assert any("/etc/exports" in warning and "1" in warning for warning in answer.get("warnings", []))
    assert "/etc/exports" in box.journal.text()


def test_a_backslash_at_the_end_of_the_line_above_takes_nothing_away(box, client, other):
    box.foresees(_COMPLAINTS)
    box.share("data")
    box.share("another")
    box.allow("data", {"client": client.address})
    with client.mounted("/srv/data") as mounted:
        write_on_top("# a comment \\\n/srv/slip *(ro) \\\n")
        box.allow("another", {"client": other.address})
        (mounted / "file").touch()
    assert client.mounts("/srv/data")
