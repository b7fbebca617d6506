"""The deliberate breaks. Each breaks one promise of docs/reliability.md and names the story that must fail."""

import dataclasses

_RELOAD = "systemctl daemon-reload; systemctl restart vornd"
_SCRIPT = "/usr/vorn/etc/rc.sysv/S83nfsd.sh"


def _preload(what):
    """A script that makes vornd run with lab/breaks/preload.c, which removes one property."""
    return (f"cp /lab/breaks/preload.so /usr/lib/; mkdir -p /etc/systemd/system/vornd.service.d; "
            f"printf '[Service]\\nEnvironment=LD_PRELOAD=/usr/lib/preload.so BREAK={what}\\n' "
            f">/etc/systemd/system/vornd.service.d/break.conf; {_RELOAD}")


def _package(edit):
    """The package with an edited control file; `edit` runs in its DEBIAN folder."""
    return (f"dpkg-deb -R /lab/package.deb /tmp/broken; (cd /tmp/broken/DEBIAN; {edit}); "
            "dpkg-deb -Znone -b /tmp/broken /lab/package.deb; dpkg --install /lab/package.deb")


@dataclasses.dataclass(frozen=True)
class Break:
    """A break of the installed product: a shell script for the guest, or an edit (sed) of each source file that has
    a text."""

    name: str
    promise: str
    story: str
    script: str = ""
    source: tuple = ()  # (text that the file has, sed expression)
    select: str = ""  # pytest's -k


BREAKS = [
    Break("no-sync", "nothing acknowledged is lost", "power_loss", _preload("sync")),
    Break("temporary-files", "no temporary file outlives the next change", "faults", _preload("temporary"),
          select="killed"),
    Break("disk-full-ignored", "a full disk is an error, not a loss", "faults", _preload("full"), select="full"),
    Break("job-result-ignored", "a service that does not start is an error", "faults",
          source=('*outcome == "done"', 's/\\*outcome == "done" || \\*outcome == "skipped"/true/'),
          select="does_not_start"),
    Break("clients-unchecked", "no parameter injects lines into a file", "hostile_rules",
          source=("CheckExportClient(client)", "s/: CheckExportClient(client);/: Status();/")),
    Break("stall-at-each-save", "clients are not interrupted by a save", "save_under_load",
          "systemd-run --quiet --unit=freeze /usr/bin/python3 /lab/breaks/freeze"),
    Break("restart-at-each-save", "clients are not interrupted by a save", "save_under_load",
          "systemd-run --quiet --unit=restarter --path-property=PathChanged=/etc/exports "
          "systemctl --no-block restart nfs-server"),
    Break("rights-stay", "a withdrawn right ends immediately", "withdrawn_rights",
          source=("ForgetExports(environment", "s/ForgetExports(environment.*write_rights)/"
                  "(static_cast<void>(environment), Status())/"), select="without_a_rule"),
    Break("read-only-stays", "a withdrawn right ends immediately", "withdrawn_rights",
          f"sed -i 's/^\tforget_rights$/\texit 0/' {_SCRIPT}", select="read_only"),
    Break("firewall-not-at-boot", "a reboot restores the service", "reboot", "systemctl disable vorn-firewall"),
    Break("server-not-at-boot", "a reboot restores the service", "reboot", "systemctl disable vornd"),
    Break("firewall-not-loaded", "the firewall follows the ports", "ports", _preload("firewall"), select="firewall"),
    Break("id-map-not-reloaded", "a changed mapping is in force immediately", "kerberos",
          f"sed -i 's/^\\treload_idmap$/\\texit 0/' {_SCRIPT}", select="id_map"),
    Break("mappings-not-followed", "a mapping is in force with the answer", "identities",
          f"sed -i 's/^\\trun idmap-compile || status=1$/\\t:/' {_SCRIPT}", select="ten_thousand"),
    Break("removed-users-fall-through", "a mapping to a removed user gives nobody else's rights", "identities",
          "rm /usr/lib/*/libnfsidmap/vorn.so", select="own_name"),
    Break("sizes-not-applied", "settings reach the clients", "service",
          f"sed -i 's/^\\ttransfer_sizes$/\\texit 0/' {_SCRIPT}", select="sizes"),
    Break("purge-takes-all", "a purge keeps what is the administrator's", "package",
          _package("sed -i 's,^  remove_imported_keytab$,  rm -rf /etc/nfs /etc/vorn,' postrm"), select="purge"),
    Break("purge-takes-nothing", "a purge leaves nothing of ours", "package",
          _package("printf '#!/bin/sh\\n' >postrm"), select="purge"),
    Break("lock-lost-at-restart", "the configuration lock of another program outlives a restart", "package",
          "mkdir -p /etc/systemd/system/vornd.service.d; printf '[Service]\\nRuntimeDirectoryPreserve=no\\n' "
          f">/etc/systemd/system/vornd.service.d/break.conf; {_RELOAD}", select="lock_of_another"),
    Break("upgrade-restarts-nfs", "an upgrade leaves NFS alone", "package",
          _package("sed -i '$i systemctl restart nfs-server || true' postinst"), select="upgrade"),
]
