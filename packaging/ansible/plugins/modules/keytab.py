#!/usr/bin/python
"""The keytab."""

DOCUMENTATION = r"""
module: keytab
short_description: Install the Kerberos keytab of the NFS service of a box
description:
  - Imports a keytab into the installed one. Keys are never shown.
version_added: 1.0.0
author: The developers of the NFS service (@vorn)
options:
  src:
    description: The keytab, a file on the managed node.
    type: path
    required: true
extends_documentation_fragment: vorn.nfs.box
"""

EXAMPLES = r"""
- name: Install the keytab
  vorn.nfs.keytab:
    src: /root/nfs.keytab
"""

RETURN = r"""#"""

import os

from ansible_collections.vorn.nfs.plugins.module_utils.box import Box

API = "VORN.Core.FileServ.NFS.Kerberos/v1"
ARGUMENTS = {"src": {"type": "path", "required": True}}


def main():
    """Runs the module."""
    box = Box(ARGUMENTS)
    path = box.options["src"]
    try:
        with open(path, "rb") as file:
            content = file.read()
    except OSError as error:
        box.fail(f"{path} cannot be read: {error.strerror}")
    box.upload(f"{API}/upload_key", "keytab_file", "keytab", content)
    box.succeed()


if __name__ == "__main__":
    main()
