#!/usr/bin/python
"""The ports of the NFS service."""

DOCUMENTATION = r"""
module: advanced
short_description: Set the ports of the NFS daemons of a box
description:
  - Sets whether statd and lockd use fixed ports, and which. A change restarts an enabled NFS service.
  - Options that are not given stay as they are, and so does everything that M(vorn.nfs.service) sets.
version_added: 1.0.0
author: The developers of the NFS service (@vorn)
options:
  fixed_ports:
    description: Whether statd and lockd use the fixed ports, which the box's firewall then opens.
    type: bool
  statd_port:
    description: Port of statd. It can only be set where fixed ports are enabled.
    type: int
  lockd_port:
    description: Port of lockd. It can only be set where fixed ports are enabled.
    type: int
extends_documentation_fragment: vorn.nfs.box
seealso:
  - module: vorn.nfs.service
"""

EXAMPLES = r"""
- name: Use fixed ports, for a firewall between the box and its clients
  vorn.nfs.advanced:
    fixed_ports: true
    statd_port: 4050
    lockd_port: 4051
"""

RETURN = r"""
actions:
  description: What was done with the service, and what clients notice of it.
  returned: always
  type: list
  elements: dict
  sample: [{"action": "restart", "clients": "restart", "grace_seconds": 90, "effect": "The NFS service restarts."}]
"""

from ansible_collections.vorn.nfs.plugins.module_utils.box import Box

SERVICE = "VORN.Core.FileServ.NFS/v1"
API = "VORN.Core.FileServ.NFS.AdvancedSetting/v1"
ARGUMENTS = {"fixed_ports": {"type": "bool"}, "statd_port": {"type": "int"}, "lockd_port": {"type": "int"}}


def main():
    """Runs the module."""
    box = Box(ARGUMENTS, required_one_of=[list(ARGUMENTS)])
    present, revision = box.read(f"{API}/get")
    ports = box.given(statd_port="statd_port", nlm_port="lockd_port")
    fixed = box.given(custom_port_enable="fixed_ports").get("custom_port_enable", bool(present["custom_port_enable"]))
    if ports and not fixed:
        box.fail("Ports can only be set where fixed ports are enabled.")
    # A call without the state of the service would disable it.
    enabled = box.read(f"{SERVICE}/get")[0]["enable_nfs"]
    box.change(f"{API}/set", {**present, "enable_nfs": enabled, "custom_port_enable": fixed, **ports}, revision)
    box.succeed()


if __name__ == "__main__":
    main()
