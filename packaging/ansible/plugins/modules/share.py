#!/usr/bin/python
"""A shared folder."""

DOCUMENTATION = r"""
module: share
short_description: Share a folder of a box, or stop sharing it
description:
  - Makes a folder a shared folder. M(vorn.nfs.exports) then sets who may mount it.
  - The folder itself and its files are never created, moved or removed.
version_added: 1.0.0
author: The developers of the NFS service (@vorn)
options:
  name:
    description: Name of the shared folder.
    type: str
    required: true
  path:
    description: Folder on the box. It is required where C(state=present).
    type: str
  state:
    description:
      - C(present) shares the folder.
      - C(absent) stops sharing it. The box refuses that while the shared folder has export rules.
    type: str
    choices: [present, absent]
    default: present
extends_documentation_fragment: vorn.nfs.box
seealso:
  - module: vorn.nfs.exports
"""

EXAMPLES = r"""
- name: Share a folder
  vorn.nfs.share:
    name: projects
    path: /volume1/projects

- name: Stop sharing it
  vorn.nfs.share:
    name: projects
    state: absent
"""

RETURN = r"""#"""

from ansible_collections.vorn.nfs.plugins.module_utils.box import Box

API = "VORN.Core.Share/v1"
ARGUMENTS = {
    "name": {"type": "str", "required": True},
    "path": {"type": "str"},
    "state": {"type": "str", "choices": ["present", "absent"], "default": "present"},
}


def main():
    """Runs the module."""
    box = Box(ARGUMENTS, required_if=[("state", "present", ["path"])])
    name, path = box.options["name"], box.options["path"]
    listed, revision = box.read(f"{API}/list")
    present = next((share["path"] for share in listed["shares"] if share["name"] == name), None)
    if box.options["state"] == "absent":
        if present is not None:
            box.change(f"{API}/delete", {"name": name}, revision)
    elif present is None:
        box.change(f"{API}/create", {"name": name, "path": path}, revision)
    elif present != path:
        box.fail(f"The shared folder {name} is {present}. Stop sharing it before it can be {path}.")
    box.succeed()


if __name__ == "__main__":
    main()
