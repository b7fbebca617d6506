#!/bin/sh
# S83nfsd.sh reloadidmap: has the running NFS service forget what it knew of ID mappings and keytabs
# and use the files as they are now. On a trial root (VORN_ROOT) it only says what it would do.
set -u

say() {
	echo "S83nfsd: $*"
}

run() {
	if [ "${VORN_ROOT:-/}" != / ]; then
		say "would run: $*"
		return 0
	fi
	"$@"
}

is_active() {
	[ "${VORN_ROOT:-/}" = / ] && systemctl -q is-active "$1"
}

# The daemon keeps the map it read when it started, and the kernel keeps its answers in the security
# contexts of the clients: only both together make a change seen. nfsidmap(8), exportfs -f and a
# restart of nfs-server leave established clients with the old map.
reload_idmap() {
	status=0
	if is_active gssproxy.service; then
		say "gssproxy serves Kerberos here: it ignores the static mappings of idmapd.conf"
		say "use auth_to_local_names in krb5.conf, or rpc.svcgssd instead"
	else
		run systemctl try-restart rpc-svcgssd.service || status=1
	fi
	run systemctl try-restart nfs-idmapd.service || status=1
	flush=/proc/net/rpc/auth.rpcsec.context/flush
	if [ "${VORN_ROOT:-/}" != / ]; then
		say "would flush the kernel's security contexts"
	elif [ -w "$flush" ]; then
		echo 1 >"$flush" || status=1
	fi
	[ "$status" = 0 ] || say "the ID map was not taken up"
	return "$status"
}

case "${1-}" in
reloadidmap)
	reload_idmap
	;;
*)
	echo "usage: $0 reloadidmap" >&2
	exit 2
	;;
esac
