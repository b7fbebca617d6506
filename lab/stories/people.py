"""People sign in with their password of the box: through PAM, under the restrictions of vornd's unit."""

import json
import time

import pytest

from harness import users
from harness.programs import run

PASSWORDS = {users.ALICE: "correct horse", users.BOB: "battery staple", users.CAROL: "not of the team"}
WRONG = "a wrong password"

LOAD, SAVE = "VORN.Core.FileServ.NFS.SharePrivilege/v1/load", "VORN.Core.FileServ.NFS.SharePrivilege/v1/save"
SESSION = "VORN.Server.Session/v1"


def call(method, token=None, **parameters):
    """Status and JSON of a call by a process that has no right of its own."""
    command = ["curl", "--silent", "--show-error", "--max-time", "120", "--unix-socket", "/run/vorn/vornd.sock",
               "--write-out", "\n%{http_code}", "--json", json.dumps(parameters)]
    if token:
        command += ["--header", f"Authorization: Bearer {token}"]
    body, status = run(*command, f"http://localhost/api/{method}", user=users.NOBODY).rsplit("\n", 1)
    return int(status), json.loads(body)


def sign_in(user, password=None):
    return call(f"{SESSION}/sign_in", account=user.name, password=password or PASSWORDS[user])


def load(token=None):
    return call(LOAD, token, share_name="data")


def save(box, token, client):
    return call(SAVE, token, share_name="data", rule=[box.rule(client=client.address)])


@pytest.fixture
def people(box):
    """alice is an administrator, bob a reader, carol neither. Each has a password in /etc/shadow."""
    box.share("data")
    run("usermod", "--append", "--groups", "vorn-admin", users.ALICE.name)
    run("usermod", "--append", "--groups", "vorn-readonly", users.BOB.name)
    lines = "".join(f"{user.name}:{password}\n" for user, password in PASSWORDS.items())
    run("sh", "-c", f"printf '%s' '{lines}' | chpasswd")
    run("systemctl", "restart", "vornd")  # without sessions and failures of another story
    yield
    for user in PASSWORDS:
        run("usermod", "--groups", "", "--expiredate", "", user.name)


@pytest.mark.usefixtures("people")
def test_an_administrator_signs_in_and_out(box, client):
    assert load()[0] == 401
    status, answer = sign_in(users.ALICE)
    assert status == 200 and answer["data"]["role"] == "administrator"
    token = answer["data"]["token"]
    assert save(box, token, client)[0] == 200
    assert client.mounts("/srv/data")
    assert call(f"{SESSION}/sign_out", token)[0] == 200
    assert load(token)[0] == 401


@pytest.mark.usefixtures("people")
def test_a_reader_reads_and_changes_nothing(box, client):
    status, answer = sign_in(users.BOB)
    assert status == 200 and answer["data"]["role"] == "reader"
    token = answer["data"]["token"]
    assert save(box, token, client)[0] == 403
    assert call(f"{SESSION}/list", token)[0] == 403
    status, answer = load(token)
    assert status == 200 and answer["data"]["rule"] == []


@pytest.mark.usefixtures("people")
def test_others_are_refused():
    assert sign_in(users.CAROL)[0] == 403, "a member of neither group"
    wrong = sign_in(users.ALICE, WRONG)
    assert wrong[0] == 401
    assert call(f"{SESSION}/sign_in", account="nobody-of-the-box", password=WRONG) == wrong
    run("usermod", "--expiredate", "1", users.ALICE.name)
    assert sign_in(users.ALICE) == wrong, "an expired account"


@pytest.mark.usefixtures("people")
def test_guessing_is_slow_and_locks_nobody_out():
    for _ in range(3):
        assert sign_in(users.ALICE, WRONG)[0] == 401
    begun = time.monotonic()
    assert sign_in(users.ALICE, WRONG)[0] == 401
    assert time.monotonic() - begun >= 1
    assert sign_in(users.ALICE)[0] == 200


@pytest.mark.usefixtures("people")
def test_no_password_and_no_session_is_logged(box):
    token = sign_in(users.ALICE)[1]["data"]["token"]
    load(token)
    sign_in(users.BOB, WRONG)
    text = box.journal.text()
    assert "alice" in text
    assert [secret for secret in (*PASSWORDS.values(), WRONG, token) if secret in text] == []
