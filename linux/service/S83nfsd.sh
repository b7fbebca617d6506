#!/bin/sh
# S83nfsd.sh reloadidmap: makes the running NFS service use the ID mappings and the keytab that are stored now.
# S83nfsd.sh idmapstart UNIT: prepares the settings that the daemon UNIT reads when it starts; the unit calls it.
# S83nfsd.sh machinekeytab: has rpc.mountd show Kerberos clients the folders above an export; the unit of svcgssd calls it.
# S83nfsd.sh transfersizes: gives the kernel the largest transfer that is configured.
# S83nfsd.sh groups: delays the start until pending group upcalls of the kernel have expired.
# S83nfsd.sh lockports: has the lock manager forget fixed ports that are no longer configured.
# S83nfsd.sh firewall: loads the firewall's table of the NFS ports again.
# The unit nfs-server calls the last four before each start.
# S83nfsd.sh forgetrights: has the kernel forget the rights that a save of export rules has changed.
# On a trial root (VORN_ROOT) it only says what it would do.
set -u

root=${VORN_ROOT:-/}
root=${root%/}
PATH=$PATH:/usr/vorn/sbin  # of idmap-compile
idmap=/var/lib/vorn/idmap  # where idmap-compile writes
keytab=/etc/nfs/krb5.keytab
firewall=/var/lib/vorn/firewall.nft  # written when ports are opened or closed

say() {
	printf '%s\n' "S83nfsd: $*"
}

run() {
	if [ -n "$root" ]; then
		say "would run: $*"
		return 0
	fi
	"$@"
}

# tell FILE VALUE: a file of the kernel's, where there is one.
tell() {
	if [ -n "$root" ]; then
		say "would write $2 to $1"
		return 0
	fi
	[ ! -e "$1" ] || printf '%s\n' "$2" >"$1"
}

is_active() {
	[ -z "$root" ] && systemctl -q is-active "$1"
}

# Whether the running daemon UNIT has read the settings that are stored now.
is_current() {
	is_active "$1.service" && cmp -s "$idmap/settings" "$idmap/$1.settings"
}

# svcgssd reads a new keytab only when it starts. A keytab of the same moment as the start counts as new, because a file
# system may store whole seconds.
is_svcgssd_current() {
	is_current rpc-svcgssd || return
	[ ! -e "$keytab" ] || [ -n "$(find "$idmap/rpc-svcgssd.settings" -newer "$keytab")" ]
}

# The daemons follow the table of mappings that idmap-compile writes. They read all other settings when they start, and
# are restarted if these have changed. The kernel keeps the daemons' answers in the security contexts of the clients
# until it is told to forget them; nfsidmap(8), exportfs -f and a restart of nfs-server do not do that. A service that
# started without a keytab started without svcgssd, which is started here when there is one.
reload_idmap() {
	status=0
	run idmap-compile || status=1
	if is_active gssproxy.service; then
		say "gssproxy serves Kerberos here: it ignores the static mappings of idmapd.conf"
		say "use auth_to_local_names in krb5.conf, or rpc.svcgssd instead"
	elif is_active nfs-server.service; then
		is_svcgssd_current || run systemctl restart rpc-svcgssd.service || status=1
	fi
	is_current nfs-idmapd || run systemctl try-restart nfs-idmapd.service || status=1
	tell /proc/net/rpc/auth.rpcsec.context/flush 1 || status=1
	[ "$status" = 0 ] || say "the ID map was not taken up"
	return "$status"
}

# The unit mounts the copy over /etc/idmapd.conf for its daemon. A failure leaves the copy of the start before.
start_idmap() {
	run idmap-compile && run cp "$idmap/settings" "$idmap/$1.new" && run mv -f "$idmap/$1.new" "$idmap/$1.settings"
}

# rpc.mountd(8) of nfs-utils 2.6.3 and later shows the folders above an export to clients with Kerberos only if the machine
# has a keytab, although the one of the service is another file. A keytab without keys is enough. The kernel then asks
# mountd again.
provide_machine_keytab() {
	machine=/etc/krb5.keytab
	if [ -e "$root$machine" ] || ! grep -qs "$machine" "$(command -v rpc.mountd)"; then return 0; fi
	if [ -n "$root" ]; then
		say "would write a keytab without keys to $machine"
		return 0
	fi
	(umask 077 && printf '\005\002' >"$machine") && tell /proc/net/rpc/nfsd.export/flush 1
}

# The kernel has one limit for both directions, which it takes only while its server has no threads.
# Without a configured size it keeps its own choice, or until it boots what it was told last.
transfer_sizes() {
	largest=0
	for key in read-size write-size; do
		size=$(nfsconf --file "$root/etc/nfs.conf" --get vorn "$key")
		case $size in
		'' | *[!0-9]*) continue ;;
		esac
		[ "$size" -le "$largest" ] || largest=$size
	done
	[ "$largest" = 0 ] || tell /proc/fs/nfsd/max_block_size "$largest"
}

# lockd_port KEY: a port of the lock manager, as rpc.statd(8) reads it. 0 or nothing is any port.
lockd_port() {
	nfsconf --file "$root/etc/nfs.conf" --get lockd "$1" | sed 's/^[[:space:]]*\([0-9]*\).*/\1/; s/^0*//'
}

# rpc.statd(8) gives the kernel the configured ports of the lock manager, but never takes one back.
lock_ports() {
	tcp=$(lockd_port port)
	udp=$(lockd_port udp-port)
	[ -n "$tcp" ] || tell /proc/sys/fs/nfs/nlm_tcpport 0
	[ -n "${udp:-$tcp}" ] || tell /proc/sys/fs/nfs/nlm_udpport 0
}

manages_groups() {
	case $(nfsconf --file "$root/etc/nfs.conf" --get mountd manage-gids | tr '[:upper:]' '[:lower:]') in
	1 | t | true | y | yes | on) return 0 ;;
	esac
	return 1
}

# The file replaces a table that is still there. There is no file while no port was ever opened.
load_firewall() {
	[ ! -e "$root$firewall" ] || run nft -f "$root$firewall"
}

# Since the box booted: the kernel chooses its limit when it serves for the first time.
has_served() {
	limit=$(cat "$root/proc/fs/nfsd/max_block_size" 2>/dev/null)
	[ "${limit:-0}" != 0 ]
}

# While rpc.mountd(8) manages groups the kernel asks it who is in which. For 30 s after it has stopped doing so the
# kernel still expects answers, and whoever asks for a file in that time waits for ever. So the first service
# that leaves groups alone begins when that time is over.
settle_groups() {
	mark=$root/run/nfs-leaves-groups-alone
	if manages_groups; then
		rm -f "$mark"
		return
	fi
	[ ! -e "$mark" ] || return 0
	if has_served; then
		say "NFS begins in half a minute: until then the kernel waits for groups that nobody tells it any more"
		run sleep 31
	fi
	[ -n "$root" ] || : >"$mark"
}

# have_expired FILE: whether the kernel grants none of the rights in FILE any more. It lists rights as
# "DIRECTORY<tab>CLIENT(OPTIONS)", with the same escape sequences, and marks those that have expired with "# ".
have_expired() {
	awk 'NR == FNR { expired[$2 "\t" $1]; next }
		{ sub(/\(.*/, "", $2) }
		($1 "\t" $2) in expired { granted = 1 }
		END { exit granted }' "$1" FS='\t' /proc/net/rpc/nfsd.export/content
}

# The platform library writes the entries, one per line ("CLIENT DIRECTORY TIME"). They concern directories in the mount
# namespace of rpc.mountd(8), which vornd.service does not share. The kernel refuses an entry of a client that it has
# forgotten meanwhile. It does not find rights in a directory that was deleted or that a mount covers: these expire only
# together with all others, and with the handles that lead to them.
forget_rights() {
	expired=$root/run/vorn/expired-rights
	[ -e "$expired" ] || return 0
	while IFS= read -r entry; do
		tell /proc/net/rpc/nfsd.export/channel "$entry" 2>/dev/null
	done <"$expired"
	if [ -n "$root" ] || have_expired "$expired"; then return; fi
	tell /proc/net/rpc/nfsd.fh/flush 1
	tell /proc/net/rpc/nfsd.export/flush 1
}

case "${1-}" in
reloadidmap)
	reload_idmap
	;;
idmapstart)
	start_idmap "${2:?UNIT}"
	;;
machinekeytab)
	provide_machine_keytab
	;;
transfersizes)
	transfer_sizes
	;;
groups)
	settle_groups
	;;
lockports)
	lock_ports
	;;
firewall)
	load_firewall
	;;
forgetrights)
	forget_rights
	;;
*)
	echo "usage: $0 reloadidmap | idmapstart UNIT | machinekeytab | transfersizes | groups | lockports | firewall |" \
		"forgetrights" >&2
	exit 2
	;;
esac
