"""vorn keytab."""

import os

from ..command import Command, argument
from ..failure import Failure
from ..files import read_bytes

_API = "VORN.Core.FileServ.NFS.Kerberos/v1"


def show(context, _arguments):
    """Prints the entries of the keytab."""
    support = context.read(f"{_API}/get").data
    if not support["kerberos_support"]:
        raise Failure("This box does not support Kerberos for NFS.")
    context.out.table(context.read(f"{_API}/list").data["keytab"], {
        "VERSION": lambda entry: entry["version"], "PRINCIPAL": lambda entry: entry["kerberos_principal"],
        "ENCRYPTION TYPE": lambda entry: entry["enc_type"]})


def import_file(context, arguments):
    """Imports a keytab."""
    content = read_bytes(arguments.file)
    name = os.path.basename(arguments.file).replace("\"", "").encode("ascii", "replace").decode()
    answer = context.api.upload(f"{_API}/upload_key", "keytab_file", name, content, rehearse=context.rehearse)
    context.finish(answer, "The keytab was imported.")


COMMANDS = (
    Command("keytab show", "show the keys of the box, without their secrets", show,
            examples=(("Principals and key versions", "vorn keytab show"),)),
    Command("keytab import", "import a keytab", import_file, changes=True, arguments=(
        argument("file", metavar="FILE", help="a keytab, as the command ktadd of kadmin(1) wrote it"),),
            examples=(("New keys", "vorn keytab import nfs.keytab"),)),
)
