"""vorn nfs, vorn advanced."""

from ..command import Command, argument, merge, require_change, switch
from ..output import yes_no

_NFS = "VORN.Core.FileServ.NFS/v1"
_ADVANCED = "VORN.Core.FileServ.NFS.AdvancedSetting/v1"
_SIZES = (
    argument("--read-size", metavar="BYTES", type=int, help="largest read transfer; 0: the system chooses"),
    argument("--write-size", metavar="BYTES", type=int, help="largest write transfer; 0: the system chooses"),
    argument("--unix-permissions", metavar="on|off", type=switch,
             help="look up the groups of users on the box, instead of using those of the request"),
)


def _size(name):
    return lambda data: data[name] or "chosen by the system"


def show_nfs(context, _arguments):
    """Prints the settings of the service."""
    context.out.record(context.read(f"{_NFS}/get").data, {
        "NFS service": lambda data: "enabled" if data["enable_nfs"] else "disabled",
        "NFSv4": lambda data: "enabled" if data["enable_nfs_v4"] else "disabled",
        "NFSv4 domain": lambda data: data["nfs_v4_domain"],
        "Read size": _size("read_size"),
        "Write size": _size("write_size"),
        "UNIX permissions": lambda data: yes_no(data["unix_pri_enable"]),
    })


def set_nfs(context, arguments):
    """Changes the given settings; the others stay as they are."""
    wanted = {"enable_nfs": arguments.service, "enable_nfs_v4": arguments.nfs4, "nfs_v4_domain": arguments.domain,
              "read_size": arguments.read_size, "write_size": arguments.write_size,
              "unix_pri_enable": arguments.unix_permissions}
    require_change(wanted)
    present = context.read(f"{_NFS}/get")
    changed = {name: value for name, value in wanted.items() if value is not None}
    # The method needs the state of the service in every call.
    parameters = {"enable_nfs": present.data["enable_nfs"], **changed}
    context.change(f"{_NFS}/set", parameters, "The settings are in force.", revision=present.revision)


def show_advanced(context, _arguments):
    """Prints the advanced settings."""
    context.out.record(context.read(f"{_ADVANCED}/get").data, {
        "Read size": _size("read_size"),
        "Write size": _size("write_size"),
        "UNIX permissions": lambda data: yes_no(data["unix_pri_enable"]),
        "Fixed ports": lambda data: yes_no(data["custom_port_enable"]),
        "Port of statd": lambda data: data["statd_port"] or "not set",
        "Port of lockd": lambda data: data["nlm_port"] or "not set",
    })


def set_advanced(context, arguments):
    """Changes the given settings; the others, and whether NFS is enabled, stay as they are."""
    wanted = {"read_size": arguments.read_size, "write_size": arguments.write_size,
              "unix_pri_enable": arguments.unix_permissions, "custom_port_enable": arguments.fixed_ports,
              "statd_port": arguments.statd_port, "nlm_port": arguments.lockd_port}
    require_change(wanted)
    present = context.read(f"{_ADVANCED}/get")
    stored = {**present.data, "custom_port_enable": bool(present.data["custom_port_enable"])}
    # A call without the state of the service would disable it.
    parameters = {**merge(stored, wanted), "enable_nfs": context.read(f"{_NFS}/get").data["enable_nfs"]}
    context.change(f"{_ADVANCED}/set", parameters, "The settings are stored.", revision=present.revision)


COMMANDS = (
    Command("nfs show", "show the settings of the service", show_nfs,
            examples=(("Whether NFS is enabled", "vorn nfs show"),)),
    Command("nfs set", "change the settings of the service", set_nfs, changes=True, arguments=(
        argument("--service", metavar="on|off", type=switch, help="enable or disable the NFS service"),
        argument("--nfs4", metavar="on|off", type=switch, help="enable or disable NFSv4"),
        argument("--domain", metavar="DOMAIN", help="the NFSv4 domain"),
    ) + _SIZES, description="Settings without an option stay as they are.", examples=(
        ("Enable NFS with NFSv4", "vorn nfs set --service on --nfs4 on --domain storage.example"),
        ("See what a new domain would do", "vorn nfs set --domain new.example --rehearse"))),
    Command("advanced show", "show transfer sizes and ports", show_advanced,
            examples=(("The ports of statd and lockd", "vorn advanced show"),)),
    Command("advanced set", "change transfer sizes and ports", set_advanced, changes=True, arguments=_SIZES + (
        argument("--fixed-ports", metavar="on|off", type=switch, help="whether statd and lockd use the fixed ports"),
        argument("--statd-port", metavar="PORT", type=int, help="the port of statd"),
        argument("--lockd-port", metavar="PORT", type=int, help="the port of lockd"),
    ), description="Settings without an option stay as they are. Changed ports restart a service that is enabled.",
            examples=(("Fixed ports, for a firewall between the box and its clients",
                       "vorn advanced set --fixed-ports on --statd-port 4050 --lockd-port 4051"),)),
)
