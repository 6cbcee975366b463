"""The same steps for many images, on this machine's processors or on a cluster: see run."""

from picturezor_batch import BatchFailure, Failed, Report, UsageFailure, run

__all__ = ["run", "Report", "Failed", "BatchFailure", "UsageFailure"]
