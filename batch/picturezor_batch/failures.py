"""What is told to a person."""


class BatchFailure(Exception):
    """The batch can't be done, or not any further."""


class UsageFailure(BatchFailure):
    """What was asked for makes no sense."""
