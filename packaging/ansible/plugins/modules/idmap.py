#!/usr/bin/python
"""The ID map."""

DOCUMENTATION = r"""
module: idmap
short_description: Map Kerberos principals to local users of a box
description:
  - Adds, changes and removes mappings of Kerberos principals to local users.
version_added: 1.0.0
author: The developers of the NFS service (@vorn)
options:
  mappings:
    description: The local user of each principal. With C(state=absent) the users do not matter.
    type: dict
    required: true
  state:
    description:
      - C(present) makes sure that the mappings are there.
      - C(exact) also removes all other mappings.
      - C(absent) removes the mappings.
    type: str
    choices: [present, exact, absent]
    default: present
extends_documentation_fragment: vorn.nfs.box
"""

EXAMPLES = r"""
- name: Map two principals
  vorn.nfs.idmap:
    mappings:
      alice@EXAMPLE.NET: alice
      backup/host.example.net@EXAMPLE.NET: backup
"""

RETURN = r"""#"""

from ansible_collections.vorn.nfs.plugins.module_utils.box import Box

API = "VORN.Core.FileServ.NFS.IDMap/v1"
ARGUMENTS = {
    "mappings": {"type": "dict", "required": True},
    "state": {"type": "str", "choices": ["present", "exact", "absent"], "default": "present"},
}


def plan(present, options):
    """The principals to be removed, and the mappings to be changed and to be added."""
    named = {principal: str(user) for principal, user in options["mappings"].items()}
    if options["state"] == "absent":
        return [principal for principal in present if principal in named], {}, {}
    removed = [principal for principal in present if principal not in named] if options["state"] == "exact" else []
    changed = {principal: user for principal, user in named.items() if present.get(principal, user) != user}
    return removed, changed, {principal: user for principal, user in named.items() if principal not in present}


def main():
    """Runs the module."""
    box = Box(ARGUMENTS)
    listed = box.read(f"{API}/list")[0]
    present = {row["id"]: row["local_name"] for row in listed["idmap"]}
    removed, changed, added = plan(present, box.options)
    if removed:
        box.change(f"{API}/delete", {"id": removed})
    for principal, user in changed.items():
        box.change(f"{API}/set", {"id": principal, "kerberos_principal": principal, "local_name": user})
    if added:
        rows = [{"kerberos_principal": principal, "local_name": user} for principal, user in added.items()]
        box.change(f"{API}/create", {"idmap": rows})
    box.succeed()


if __name__ == "__main__":
    main()
