#!/usr/bin/python
"""The settings of the NFS service."""

DOCUMENTATION = r"""
module: service
short_description: Set the NFS service of a box
description:
  - Enables or disables the NFS service and NFSv4, and sets the NFSv4 domain, the transfer sizes and the UNIX permissions.
  - Options that are not given stay as they are.
version_added: 1.0.0
author: The developers of the NFS service (@vorn)
options:
  enabled:
    description: Whether the NFS service runs, now and after each boot.
    type: bool
  nfs4:
    description: Whether NFSv4 is served besides NFSv3.
    type: bool
  domain:
    description: The NFSv4 domain. It can only be set where NFSv4 is enabled.
    type: str
  read_size:
    description: Largest read transfer in bytes; C(0) leaves the choice to the system.
    type: int
  write_size:
    description: Largest write transfer in bytes; C(0) leaves the choice to the system.
    type: int
  unix_permissions:
    description: Whether the box looks up the groups of a user, instead of using those of the request.
    type: bool
extends_documentation_fragment: vorn.nfs.box
"""

EXAMPLES = r"""
- name: Serve NFS with NFSv4
  vorn.nfs.service:
    enabled: true
    nfs4: true
    domain: storage.example
"""

RETURN = r"""
actions:
  description: What was done with the service, and what clients notice of it.
  returned: always
  type: list
  elements: dict
  sample: [{"action": "start", "clients": "start", "effect": "The NFS service starts, now and at each boot."}]
"""

from ansible_collections.vorn.nfs.plugins.module_utils.box import Box

API = "VORN.Core.FileServ.NFS/v1"
ARGUMENTS = {
    "enabled": {"type": "bool"},
    "nfs4": {"type": "bool"},
    "domain": {"type": "str"},
    "read_size": {"type": "int"},
    "write_size": {"type": "int"},
    "unix_permissions": {"type": "bool"},
}


def main():
    """Runs the module."""
    box = Box(ARGUMENTS, required_one_of=[list(ARGUMENTS)])
    present, revision = box.read(f"{API}/get")
    wanted = {**present, **box.given(enable_nfs="enabled", enable_nfs_v4="nfs4", nfs_v4_domain="domain",
                                     read_size="read_size", write_size="write_size",
                                     unix_pri_enable="unix_permissions")}
    # The box ignores a domain while NFSv4 is disabled.
    if wanted["nfs_v4_domain"] != present["nfs_v4_domain"] and not wanted["enable_nfs_v4"]:
        box.fail("The domain can only be set where NFSv4 is enabled.")
    box.change(f"{API}/set", wanted, revision)
    box.succeed()


if __name__ == "__main__":
    main()
