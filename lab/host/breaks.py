"""The deliberate breaks. Each breaks one promise of docs/reliability.md and names the story that must fail."""

import dataclasses

_RELOAD = "systemctl daemon-reload; systemctl restart vornd"
_SCRIPT = "/usr/vorn/etc/rc.sysv/S83nfsd.sh"


def _preload(what):
    """A script that makes vornd run with lab/breaks/preload.c, which removes one property."""
    return (f"cp /lab/breaks/preload.so /usr/lib/; mkdir -p /etc/systemd/system/vornd.service.d; "
            f"printf '[Service]\\nEnvironment=LD_PRELOAD=/usr/lib/preload.so BREAK={what}\\n' "
            f">/etc/systemd/system/vornd.service.d/break.conf; {_RELOAD}")


def _package(edit, name="vorn-platform-linux"):
    """A package with edited control files; `edit` runs in its DEBIAN folder."""
    return (f"package=$(ls /lab/packages/{name}_*); dpkg-deb -R $package /tmp/broken; "
            f"(cd /tmp/broken/DEBIAN; {edit}); dpkg-deb -Znone -b /tmp/broken $package; dpkg --install $package")


# A save has exportfs(8) apply all files anew, instead of the difference.
_WHOLE_TABLE = ("HasThreads() ? ApplyExports(", 's/return HasThreads() ? ApplyExports([^;]*;/'
                'return std::system("exportfs -r") == 0 ? Status() : Status();/')


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
    release: str = "bookworm"  # of Debian, in the guest


BREAKS = [
    Break("no-sync", "nothing acknowledged is lost", "power_loss", _preload("sync")),
    Break("temporary-files", "no temporary file outlives the next change", "faults", _preload("temporary"),
          select="killed"),
    Break("disk-full-ignored", "a full disk is an error, not a loss", "faults", _preload("full"), select="full"),
    Break("job-result-ignored", "a service that does not start is an error", "faults",
          source=('*outcome == "done"', 's/\\*outcome == "done" || \\*outcome == "skipped"/true/'),
          select="does_not_start"),
    Break("threads-not-counted", "a service that does not start is an error", "faults",
          source=("if (!HasThreads()) {", "s/if (!HasThreads()) {/if (false) {/"), select="without_threads",
          release="trixie"),
    Break("active-unit-started", "a service that does not start is an error", "faults",
          source=("? \"StartUnit\" : \"RestartUnit\"", "s/HasThreads() ? \"StartUnit\" : \"RestartUnit\"/\"StartUnit\"/;"
                  " s/^.*active would claim to serve$//"), select="without_threads", release="trixie"),
    Break("clients-unchecked", "no parameter injects lines into a file", "hostile_rules",
          source=("CheckExportClient(client)", "s/: CheckExportClient(client);/: Status();/")),
    Break("stall-at-each-save", "clients are not interrupted by a save", "save_under_load",
          "systemd-run --quiet --unit=freeze /usr/bin/python3 /lab/breaks/freeze"),
    Break("restart-at-each-save", "clients are not interrupted by a save", "save_under_load",
          "systemd-run --quiet --unit=restarter --path-property=PathChanged=/etc/exports "
          "--property=StartLimitIntervalSec=0 /bin/sh /lab/breaks/restart"),
    Break("others-rights-forgotten", "a save concerns its own share only", "scale",
          source=("HasLeftVolume(update) ? rights", "s/HasLeftVolume(update) ? rights/true || &/")),
    Break("lines-after-a-fault-lost", "a faulty line takes nothing from anybody", "faulty_lines", source=_WHOLE_TABLE,
          select="beside_a_faulty_line"),
    Break("unresolved-names-lost", "a name server that is away takes nothing", "names_away", source=_WHOLE_TABLE,
          select="another_share"),
    Break("names-not-followed", "a machine that left a netgroup loses its right", "withdrawn_rights",
          "systemctl disable --now vorn-nfs-names.timer", select="netgroup"),
    Break("rights-stay", "a withdrawn right ends immediately", "withdrawn_rights",
          source=("ForgetExports(environment", "s/ForgetExports(environment.*write_rights)/"
                  "(static_cast<void>(environment), Status())/"), select="without_a_rule"),
    Break("read-only-stays", "a withdrawn right ends immediately", "withdrawn_rights",
          f"sed -i 's/^\tforget_rights$/\texit 0/' {_SCRIPT}", select="read_only"),
    Break("covered-folders-keep-rights", "a withdrawn right ends immediately", "withdrawn_rights",
          f"sed -i 's/|| have_expired \"[^;]*; then return; fi/|| true; then return; fi/' {_SCRIPT}",
          select="covered"),
    Break("moved-folders-keep-rights", "a withdrawn right ends immediately", "withdrawn_rights",
          source=("bool HasMoved(", "s/return !IsOneOrAboveOne/return exported.empty() \\&\\& !IsOneOrAboveOne/"),
          select="moved"),
    Break("unit-decides-over-threads", "a withdrawn right ends immediately", "withdrawn_rights",
          source=("bool HasThreads() const {", "s/bool HasThreads() const {/bool HasThreads() const {\\n"
                  "    if (std::system(\"systemctl is-active --quiet nfs-server\") != 0) return false;/"),
          select="threads_run_without"),
    Break("left-shares-not-named", "an exported path that is no share is named", "withdrawn_rights",
          source=("is exported although it is no share any more", "s/^  LogDone(LOG_WARNING, directory + \" is exported "
                  "although/  if (directory.empty()) LogDone(LOG_WARNING, directory + \" is exported although/"),
          select="no_share"),
    Break("lock-ports-stay", "fixed ports that are switched off are free", "advanced",
          f"sed -i 's/^\tlock_ports$/\t:/' {_SCRIPT}", select="switched_off_are_free"),
    Break("firewall-not-at-boot", "a reboot restores the service", "reboot", "systemctl disable vorn-firewall"),
    Break("server-not-at-boot", "a reboot restores the service", "reboot", "systemctl disable vornd"),
    Break("clients-not-notified", "after a reboot clients may reclaim their locks", "reboot_locks",
          "systemctl mask rpc-statd-notify"),
    Break("state-forgotten", "after a reboot clients may reclaim their locks", "reboot_locks",
          "mkdir -p /etc/systemd/system/nfsdcld.service.d; printf '[Service]\nExecStartPre=/bin/rm -rf "
          "/var/lib/nfs/nfsdcld/main.sqlite\n' >/etc/systemd/system/nfsdcld.service.d/break.conf"),
    Break("firewall-not-reloaded", "the firewall follows the ports", "ports",
          "sed -i '/^PartOf=\|^ReloadPropagatedFrom=/d' /lib/systemd/system/vorn-firewall.service; "
          "systemctl daemon-reload", select="loads_its_own_rules_again"),
    Break("firewall-not-loaded", "the firewall follows the ports", "ports", _preload("firewall"), select="firewall"),
    Break("former-keys-dropped", "a keytab with the former keys interrupts nobody", "kerberos",
          source=("box.Replace(kKeytabFile, content,", "s|box.Replace(kKeytabFile, content,|box.Replace(kKeytabFile, "
                  "content.size() < 130 ? content : std::string{5, 2} + content.substr(content.size() / 2 + 1),|"),
          select="with_the_former_keys"),
    Break("lost-keys-not-named", "the answer warns of a keytab without former keys", "kerberos",
          source=("replaced.ok()) NameLostKeys", "s/replaced.ok()) NameLostKeys/false) NameLostKeys/"),
          select="without_the_former_keys"),
    Break("firewall-not-with-nfs", "the firewall follows the ports", "ports",
          f"sed -i 's/^\\tload_firewall$/\\texit 0/' {_SCRIPT}", select="start_of_nfs"),
    Break("id-map-not-reloaded", "a changed mapping is in force immediately", "kerberos",
          f"sed -i 's/^\\treload_idmap$/\\texit 0/' {_SCRIPT}", select="id_map"),
    Break("mappings-not-followed", "a mapping is in force with the answer", "identities",
          f"sed -i 's/^\\trun idmap-compile || status=1$/\\t:/' {_SCRIPT}", select="ten_thousand"),
    Break("removed-users-fall-through", "a mapping to a removed user gives nobody else's rights", "identities",
          "rm /usr/lib/*/libnfsidmap/vorn.so", select="own_name"),
    Break("sizes-not-applied", "settings reach the clients", "service",
          f"sed -i 's/^\\ttransfer_sizes$/\\texit 0/' {_SCRIPT}", select="sizes"),
    Break("any-password", "people get in by their password", "people",
          "sed -i 's/^@include common-auth/auth sufficient pam_permit.so/' /usr/lib/pam.d/vornd", select="others"),
    Break("passwords-out-of-reach", "people get in by their password", "people",
          "mkdir -p /etc/systemd/system/vornd.service.d; printf '[Service]\\nInaccessiblePaths=/etc/shadow\\n' "
          f">/etc/systemd/system/vornd.service.d/break.conf; {_RELOAD}", select="signs_in"),
    Break("settings-not-read-again", "a reload applies the settings, and fails with a fault", "tls",
          "mkdir -p /etc/systemd/system/vornd.service.d; printf '[Service]\\nExecReload=\\nExecReload=/bin/true\\n' "
          f">/etc/systemd/system/vornd.service.d/break.conf; {_RELOAD}", select="fault"),
    Break("accounts-not-created", "the package creates the accounts of the squash modes", "package",
          _package("sed -i 's/^  make_account /  : make_account /' postinst"), select="accounts"),
    Break("purge-takes-all", "a purge keeps what is the administrator's", "package",
          _package("sed -i 's,^  remove_imported_keytab$,  rm -rf /etc/nfs /etc/vorn,' postrm"), select="purge"),
    Break("purge-takes-nothing", "a purge leaves nothing of ours", "package",
          _package("printf '#!/bin/sh\\n' >postrm"), select="purge"),
    Break("lock-lost-at-restart", "the configuration lock of another program outlives a restart", "package",
          "mkdir -p /etc/systemd/system/vornd.service.d; printf '[Service]\\nRuntimeDirectoryPreserve=no\\n' "
          f">/etc/systemd/system/vornd.service.d/break.conf; {_RELOAD}", select="lock_of_another"),
    Break("tokens-lost-at-upgrade", "an upgrade keeps settings and tokens", "package",
          _package("sed -i '2i rm -f /var/lib/vorn/tokens.json' postinst", "vorn-server"), select="single_package"),
    Break("installed-without-tls", "a first installation serves over TLS, and an upgrade opens no port", "package",
          _package("sed -i 's/ tls:0.0.0.0:/ 127.0.0.1:/' postinst", "vorn-server"), select="first_installation"),
    Break("upgrade-opens-a-port", "a first installation serves over TLS, and an upgrade opens no port", "package",
          _package("sed -i 's/^  if .*; then make_configuration; fi/  make_configuration/' postinst", "vorn-server"),
          select="single_package"),
    Break("modules-not-followed", "an installed module is served", "package",
          _package("sed -i /interest/d triggers", "vorn-server"), select="follows_its_modules"),
    Break("rules-not-dumped", "a dump restores the box", "command_line",
          """sed -i 's/"rules": rules.data."rule"./"rules": []/' /usr/share/vorn/cli/vorn_cli/commands/state.py""",
          select="dump"),
    Break("kinds-in-reverse", "an explanation is what the kernel does", "explain",
          source=("exports[a].kind < exports[b].kind", "s/exports\\[a\\].kind < exports\\[b\\].kind/"
                  "exports[a].kind > exports[b].kind/")),
    Break("half-of-an-address", "an explanation is what the kernel does", "explain",
          source=("at < network.mask.size()", "s/at < network.mask.size()/at < 8/"), select="kernel_does"),
    Break("names-confirmed", "an explanation is what the kernel does", "explain",
          source=("client->names = std::move(*names);", "s/client->names = /if (client->is_name_confirmed) &/"),
          select="lead_back"),
    Break("pending-rules-unseen", "a check finds what is not in force", "health",
          source=("return std::move(update->changed);", "s/return std::move(update->changed);/"
                  "return std::set<std::string>();/"), select="not_in_force"),
    Break("any-client-id", "the end of a client's state ends no other client's", "clients",
          source=("(*text).client_id != client_id) return left;",
                  "s/if (ParseClientInfo([*]text).client_id != client_id) return left;//"), select="loses_its_locks"),
    Break("upgrade-restarts-nfs", "an upgrade leaves NFS alone", "package",
          _package("sed -i '$i systemctl restart nfs-server || true' postinst"), select="upgrade"),
]

# The stories that no break guards, with the reason.
WITHOUT_BREAK = {
    "export_clients": "who is meant by a client is decided by mountd(8), and the lab does not break that; a client that is "
                      "written wrongly fails tests/linux/exports_client_test",
    "export_options": "what an option does is decided by the kernel, and the lab does not break that; an option that is "
                      "written wrongly fails tests/linux/exports_options_test and share_rules_test",
    "locks": "locks across a restart are kept by the kernel and the clients; the product restarts, which "
             "\"restart-at-each-save\" shows to be noticed",
    "nested_shares": "the limits that are shown are the kernel's; the warning is tested by tests/linux/share_rules_test",
    "versions": "versions and networks are the kernel's; the settings are those of \"service\"",
}


def stories_without_reason(names):
    """The stories that neither a break nor WITHOUT_BREAK names.

    >>> from host import stories
    >>> stories_without_reason(story.name for story in stories.find([]))
    []
    """
    guarded = {item.story for item in BREAKS}
    return sorted(set(names) - guarded - set(WITHOUT_BREAK))
