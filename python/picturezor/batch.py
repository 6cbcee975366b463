"""The same steps for many images (run), and one image pyramid by parts (tiles), on this machine's processors or on a
cluster."""

from picturezor_batch import BatchFailure, Failed, Report, UsageFailure, run, tiles

__all__ = ["run", "tiles", "Report", "Failed", "BatchFailure", "UsageFailure"]
