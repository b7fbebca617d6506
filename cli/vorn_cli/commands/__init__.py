"""All commands, in the order of the help."""

from . import access, calls, clients, explain, exports, health, history, idmap, keytab, service, shares, state

GROUPS = {
    "nfs": "the NFS service",
    "advanced": "transfer sizes, UNIX permissions and fixed ports",
    "exports": "the export rules of shared folders",
    "clients": "the clients of the NFS service",
    "idmap": "the mappings of Kerberos principals to local users",
    "keytab": "the Kerberos keys of the box",
    "share": "shared folders",
    "token": "tokens for programs",
    "session": "sessions of people",
}

COMMANDS = (service.COMMANDS + exports.COMMANDS + explain.COMMANDS + clients.COMMANDS + health.COMMANDS + idmap.COMMANDS +
            keytab.COMMANDS + shares.COMMANDS + state.COMMANDS + history.COMMANDS + access.COMMANDS + calls.COMMANDS)
