#!/usr/bin/python
"""The export rules of a shared folder."""

DOCUMENTATION = r"""
module: exports
short_description: Set the export rules of a shared folder of a box
description:
  - Sets who may mount a shared folder, and how. The rules replace all rules of the folder.
version_added: 1.0.0
author: The developers of the NFS service (@vorn)
options:
  share:
    description: Name of the shared folder.
    type: str
    required: true
  rules:
    description: All rules of the folder. An empty list takes away all access.
    type: list
    elements: dict
    required: true
    suboptions:
      client:
        description: Host name, address, network, wildcard pattern or netgroup, as exports(5) has them.
        type: str
        required: true
      access:
        description: C(ro) permits reading, C(rw) reading and writing.
        type: str
        choices: [ro, rw]
        default: ro
      squash:
        description:
          - C(root) maps nobody. C(admin) maps the client's root user to the administrator account, and C(guest) to the
            guest account. C(all_admin) maps every user to the administrator account.
        type: str
        choices: [root, admin, guest, all_admin]
        default: guest
      security:
        description: The accepted security flavours, as mount options have them.
        type: list
        elements: str
        choices: [sys, krb5, krb5i, krb5p]
        default: [sys]
      async:
        description: Whether the box may answer a write before the data is on disk.
        type: bool
        default: false
      insecure:
        description: Whether requests from ports above 1023 are accepted.
        type: bool
        default: false
      crossmnt:
        description: Whether clients may enter file systems that are mounted below the folder.
        type: bool
        default: false
extends_documentation_fragment: vorn.nfs.box
seealso:
  - module: vorn.nfs.share
"""

EXAMPLES = r"""
- name: Let a network read, and one host write
  vorn.nfs.exports:
    share: projects
    rules:
      - client: 10.20.0.0/16
      - client: build01.example.net
        access: rw
        security: [krb5p]
"""

RETURN = r"""
rules:
  description: For each client that gained or lost something, what it was.
  returned: always
  type: list
  elements: dict
  sample: [{"client": "10.20.0.0/16", "directory": "/volume1/projects",
            "changes": [{"access": "less", "change": "removed", "text": "loses its rule"}]}]
"""

from ansible_collections.vorn.nfs.plugins.module_utils.box import Box

API = "VORN.Core.FileServ.NFS.SharePrivilege/v1"
FLAVORS = {"sys": "sys", "krb5": "kerberos", "krb5i": "kerberos_integrity", "krb5p": "kerberos_privacy"}
ARGUMENTS = {
    "share": {"type": "str", "required": True},
    "rules": {"type": "list", "elements": "dict", "required": True, "options": {
        "client": {"type": "str", "required": True},
        "access": {"type": "str", "choices": ["ro", "rw"], "default": "ro"},
        "squash": {"type": "str", "choices": ["root", "admin", "guest", "all_admin"], "default": "guest"},
        "security": {"type": "list", "elements": "str", "choices": list(FLAVORS), "default": ["sys"]},
        "async": {"type": "bool", "default": False},
        "insecure": {"type": "bool", "default": False},
        "crossmnt": {"type": "bool", "default": False},
    }},
}


def parameters_of(rule):
    """A rule of the task as the box has it."""
    return {"client": rule["client"], "privilege": rule["access"], "root_squash": rule["squash"],
            "security_flavor": {name: word in rule["security"] for word, name in FLAVORS.items()},
            "async": rule["async"], "insecure": rule["insecure"], "crossmnt": rule["crossmnt"]}


def main():
    """Runs the module."""
    box = Box(ARGUMENTS)
    share = box.options["share"]
    revision = box.read(f"{API}/load", {"share_name": share})[1]
    rules = [parameters_of(rule) for rule in box.options["rules"]]
    box.change(f"{API}/save", {"share_name": share, "rule": rules}, revision)
    box.succeed()


if __name__ == "__main__":
    main()
