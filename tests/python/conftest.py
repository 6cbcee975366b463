import gc
import pathlib

import picturezor as pz
import pytest
from hypothesis import settings

# The same cases each time, and no files left.
settings.register_profile("here", database=None, derandomize=True)
settings.load_profile("here")
SOURCE = pathlib.Path(__file__).resolve().parents[2]


@pytest.fixture
def lake():
    return SOURCE / "examples" / "lake.jpg"


@pytest.fixture(scope="session", autouse=True)
def nothing_is_left(request):
    before = pz.alive()
    yield
    gc.collect()
    # What failed keeps its frames.
    assert request.session.testsfailed or pz.alive() == before
