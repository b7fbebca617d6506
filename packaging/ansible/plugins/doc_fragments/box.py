"""The options that all modules have."""


class ModuleDocFragment:
    """Documentation of the connection to a box."""

    DOCUMENTATION = r"""
options:
  socket:
    description:
      - Path of the box's Unix socket. It is used where C(url) is not given.
      - The account that runs the module must be root or belong to the administrators' group; it needs no token.
    type: path
    default: /run/vorn/vornd.sock
  url:
    description: Address of a box that is reached over the network, for example C(https://box.example:8443).
    type: str
  token:
    description: Bearer token for C(url), as C(vorn token create) prints it.
    type: str
  fingerprint:
    description:
      - SHA-256 fingerprint of the certificate of C(url), as the box prints it at its start.
      - Without it, an authority of the managed node's system must vouch for the certificate.
    type: str
requirements:
  - Python 3.10 or later on the managed node
attributes:
  check_mode:
    description: The box rehearses the change and changes nothing.
    support: full
  diff_mode:
    description: The differences of the box's files, as the box foretells them.
    support: full
"""
