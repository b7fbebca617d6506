"""vorn login, logout, whoami, token, session."""

import getpass
import sys

from .. import credentials
from ..api import Api
from ..command import Command, Context, argument
from ..connection import check_url, presented_fingerprint
from ..failure import Exit, Failure
from ..output import time_of

_TOKEN = "VORN.Server.Token/v1"
_SESSION = "VORN.Server.Session/v1"
_DAY = 24 * 60 * 60


def login(context, arguments):
    """Keeps a token and the certificate's fingerprint of a box."""
    url = check_url(arguments.url)
    fingerprint = _agreed_fingerprint(url, arguments.fingerprint)
    token = _token()
    caller = Context(Api(url, token, fingerprint), context.out).read(f"{_SESSION}/get").data
    credentials.store(url, token, fingerprint)
    context.out.text(f"You are \"{caller['caller']}\" ({caller['role']}) at {url}.")


def _token():
    if sys.stdin.isatty():
        return getpass.getpass("Token: ").strip()
    return sys.stdin.readline().strip()


def _agreed_fingerprint(url, expected):
    """Returns the fingerprint to keep; None where the authorities of this system vouch for the certificate."""
    if url.startswith("http:"):
        return None
    presented = presented_fingerprint(url)
    if presented is None or presented == expected:
        return presented
    if expected:
        raise Failure(f"The certificate has another fingerprint: {presented}", Exit.NO_CONNECTION)
    if not sys.stdin.isatty():
        raise Failure("No authority vouches for the certificate: give --fingerprint.", Exit.NO_CONNECTION,
                      (f"presented: {presented}",))
    print(f"The certificate of {url} has the fingerprint\n  {presented}")
    print("\"vornd --check\" on the box prints the one that it must have.")
    if input("Is it the same? [y/N] ").strip().lower() not in ("y", "yes"):
        raise Failure("Nothing was kept.", Exit.NO_CONNECTION)
    return presented


def logout(context, arguments):
    """Forgets the token of a box. The box still accepts it."""
    if not credentials.remove(check_url(arguments.url)):
        raise Failure(f"No token is kept for {arguments.url}.")
    context.out.text("The token was removed here. \"vorn token revoke\" makes the box refuse it.")


def whoami(context, _arguments):
    """Prints who the caller is for the box."""
    context.out.record(context.read(f"{_SESSION}/get").data, {
        "Caller": lambda data: data["caller"], "Role": lambda data: data["role"],
        "Only these APIs": lambda data: data["apis"] or "all", "Only these shares": lambda data: data["shares"] or "all"})


def list_tokens(context, _arguments):
    """Prints the tokens."""
    context.out.table(context.read(f"{_TOKEN}/list").data, {
        "ID": lambda token: token["id"], "NAME": lambda token: token["name"], "ROLE": lambda token: token["role"],
        "APIS": lambda token: token["apis"] or "all", "SHARES": lambda token: token["shares"] or "all",
        "EXPIRES": lambda token: time_of(token["expires"]), "LAST USED": lambda token: time_of(token["last_used"])})


def create_token(context, arguments):
    """Creates a token and prints it."""
    parameters = {"name": arguments.name, "role": arguments.role}
    if arguments.api:
        parameters["apis"] = arguments.api
    if arguments.share:
        parameters["shares"] = arguments.share
    if arguments.days is not None:
        parameters["expires_in"] = arguments.days * _DAY
    data = context.read(f"{_TOKEN}/create", parameters).data
    context.out.data(data)
    context.out.text(data["token"])


def revoke_token(context, arguments):
    """Revokes a token, given by its id or its name."""
    tokens = context.read(f"{_TOKEN}/list").data
    found = [token["id"] for token in tokens if arguments.token in (token["id"], token["name"])]
    if not found:
        raise Failure(f"There is no token {arguments.token}.")
    context.change(f"{_TOKEN}/revoke", {"id": found[0]}, f"The token {arguments.token} is refused from now on.")


def list_sessions(context, _arguments):
    """Prints the sessions."""
    context.out.table(context.read(f"{_SESSION}/list").data, {
        "ID": lambda session: session["id"], "ACCOUNT": lambda session: session["account"],
        "ROLE": lambda session: session["role"], "ADDRESS": lambda session: session["address"],
        "SINCE": lambda session: time_of(session["created"])})


def end_session(context, arguments):
    """Ends a session."""
    context.change(f"{_SESSION}/end", {"id": arguments.id}, "The session has ended.")


COMMANDS = (
    Command("token list", "list the tokens", list_tokens, examples=(("All tokens", "vorn token list"),)),
    Command("token create", "create a token for a program", create_token, arguments=(
        argument("name", metavar="NAME", help="a unique name"),
        argument("--role", choices=("reader", "administrator"), default="reader", help="default reader"),
        argument("--api", metavar="API", action="append", help="may only call this API; may be repeated"),
        argument("--share", metavar="SHARE", action="append", help="may only name this shared folder; may be repeated"),
        argument("--days", metavar="N", type=int, help="days until it expires; default never")),
            description="Prints the token. It cannot be shown again.",
            examples=(("A program that manages one folder", "vorn token create backup --role administrator --share data"),)),
    Command("token revoke", "revoke a token", revoke_token,
            arguments=(argument("token", metavar="TOKEN", help="its id or its name"),),
            examples=(("Refuse it from now on", "vorn token revoke backup"),)),
    Command("session list", "list the sessions of people", list_sessions,
            examples=(("Who has signed in", "vorn session list"),)),
    Command("session end", "end a session", end_session, arguments=(argument("id", metavar="ID", help="its id"),),
            examples=(("End one", "vorn session end 9b1f5c0d77e2463a"),)),
    Command("login", "keep the token and the certificate's fingerprint of a box", login, needs_box=False, arguments=(
        argument("url", metavar="URL", help="for example https://box.example:8443"),
        argument("--fingerprint", metavar="SHA256", help="the fingerprint that the certificate must have")),
            description="Reads the token from the terminal, or a line of standard input, and keeps it in a file that "
                        "only you can read. Afterwards \"--url URL\" uses it.",
            examples=(("From another machine", "vorn login https://box.example:8443"),)),
    Command("logout", "forget the token of a box", logout, needs_box=False,
            arguments=(argument("url", metavar="URL", help="as it was given to \"vorn login\""),),
            examples=(("Forget it", "vorn logout https://box.example:8443"),)),
    Command("whoami", "show who you are for the box, and what you may do", whoami,
            examples=(("Your role", "vorn whoami"),)),
)
