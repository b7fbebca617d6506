"""The command line of the box: every command is a call of its web API."""

VERSION = "1.2.0"
