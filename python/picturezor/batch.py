"""Applies the same steps to many images (run), and makes one image pyramid in parts (tiles), on the processors of this
machine or on a cluster."""

from picturezor_batch import BatchFailure, Failed, Report, UsageFailure, run, tiles

__all__ = ["run", "tiles", "Report", "Failed", "BatchFailure", "UsageFailure"]
