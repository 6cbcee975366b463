"""Many pictures on many machines, by the workers of Dask's distributed scheduler. They run the command picturezor,
so a result has the same bytes wherever it was made."""

from .batch import Failed, Report, run
from .failures import BatchFailure, UsageFailure
from .pyramid import tiles

__all__ = ["run", "tiles", "Report", "Failed", "BatchFailure", "UsageFailure"]
