"""Applies the same steps to many images, on one machine or on a cluster, with Dask's distributed scheduler. Its workers
run the command picturezor, so a result has the same bytes wherever it was made."""

from .batch import Failed, Report, run
from .failures import BatchFailure, UsageFailure
from .pyramid import tiles

__all__ = ["run", "tiles", "Report", "Failed", "BatchFailure", "UsageFailure"]
