"""Failures that end a command, and the exit statuses of the program."""

import enum


class Exit(enum.IntEnum):
    """The exit status by outcome; the manual page lists them."""

    SUCCESS = 0
    FAILED = 1  # the box refused the call, or could not carry it out
    DIFFERS = 2  # only "vorn apply --check": the box is not in the wanted state
    NOT_PERMITTED = 3  # the credentials are missing, wrong, or not enough
    NO_CONNECTION = 4  # the box cannot be reached, or its certificate is not the known one
    CHANGED_MEANWHILE = 5  # somebody else changed the same thing; nothing was done
    HEALTH_WARNINGS = 6  # only "vorn health": the worst finding is a warning
    HEALTH_ERRORS = 7  # only "vorn health": the worst finding is an error
    USAGE = 64  # the command line is wrong; nothing was done


class Failure(Exception):
    """Ends the command with a message on standard error."""

    def __init__(self, message, status=Exit.FAILED, details=()):
        super().__init__(message)
        self.status = status
        self.details = tuple(details)  # further lines: reasons, and what to do
