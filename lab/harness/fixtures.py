"""The fixtures of the stories, and their markers."""

import pytest

from harness import api, fixture_data, kerberos, network, programs, users
from harness.box import Box

_machines = {}
_PROMISE_BROKEN = (AssertionError, OSError, api.Refused, network.MountFailed, programs.ProgramFailed)


def pytest_addoption(parser):
    parser.addoption("--boot", default="1/1", help="the number of this boot of the disk: NUMBER/COUNT")
    parser.addoption("--long", action="store_true", help="run the long stories, too")
    parser.addoption("--seed", type=int, default=1, help="chooses the generated cases")
    parser.addoption("--cases", type=int, help="the number of generated cases, instead of the story's own")


def _this_boot(config):
    number, count = config.getoption("--boot").split("/")
    return int(number), int(count)


def _boot_of(item):
    marker = item.get_closest_marker("boot")
    return marker.args[0] if marker else 1


def pytest_collection_modifyitems(config, items):
    """Selects the stories of this boot. A pending story must fail, and only with an assertion about the promise."""
    number, _ = _this_boot(config)

    def is_selected(item):
        return _boot_of(item) == number and (config.getoption("--long") or not item.get_closest_marker("long"))

    config.hook.pytest_deselected(items=[item for item in items if not is_selected(item)])
    items[:] = [item for item in items if is_selected(item)]
    for item in items:
        pending = item.get_closest_marker("pending")
        if pending:
            item.add_marker(pytest.mark.xfail(reason=pending.args[0], strict=True, raises=_PROMISE_BROKEN))


@pytest.hookimpl(hookwrapper=True)
def pytest_runtest_makereport(item):
    """Records whether the story itself failed. Complaints in the journal are then not reported as a second failure."""
    report = (yield).get_result()
    if report.when == "call":
        item.kept_its_promise = report.passed


def pytest_runtest_logreport(report):
    """Prints a failure immediately, because a guest that hangs later prints no report."""
    if report.failed:
        with open("/dev/console", "w", encoding="utf-8") as console:
            console.write(f"\n{report.nodeid} ({report.when}):\n{report.longreprtext}\n")


@pytest.fixture(scope="session", autouse=True)
def _prepared(pytestconfig):
    number, _ = _this_boot(pytestconfig)
    if number == 1:
        fixture_data.prepare()


@pytest.fixture
def box(request, pytestconfig):
    """A box that serves and exports nothing. When the story is over, the box is as it was before; a complaint in the
    journal that the story did not foresee is a failure. Between the boots of a story the box is left alone."""
    number, count = _this_boot(pytestconfig)
    the_box = Box(since_boot=number > 1)
    if number == 1:
        the_box.set_up()
    yield the_box
    if number == count:
        for machine in _machines.values():
            machine.unmount_all()
        the_box.put_back()
    complaints = the_box.journal.complaints() + api.slow_answers()
    if getattr(request.node, "kept_its_promise", False):
        assert not complaints, "\n".join(complaints)
    elif complaints:
        print("The journal says:", *complaints, sep="\n")


def _machine(name):
    if name not in _machines:
        _machines[name] = fixture_data.machine(name)
    return _machines[name]


@pytest.fixture
def client():
    """A client machine."""
    return _machine("client")


@pytest.fixture
def other():
    """Another client machine, on the same network."""
    return _machine("other")


@pytest.fixture
def third():
    """A client machine in another network and another domain."""
    return _machine("third")


@pytest.fixture(scope="session")
def realm():
    """A Kerberos realm."""
    kerberos.found_realm()


@pytest.fixture
def kerberos_client(realm, client):
    """A client machine in the realm."""
    del realm
    with kerberos.joined(client):
        yield client
        client.unmount_all()
    for user in (users.ALICE, users.BOB, users.CAROL):
        kerberos.sign_out(user)
