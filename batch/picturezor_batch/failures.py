"""Exceptions whose messages are meant for users."""


class BatchFailure(Exception):
    """The batch can't be started, or can't continue."""


class UsageFailure(BatchFailure):
    """The arguments are invalid or contradict each other."""
