"""Fixtures of the lumtdm tests: the tdm demo's type libraries and database."""

import os
import shutil
import subprocess

import pytest

lumtdm = pytest.importorskip("lumtdm", reason="the lumtdm module is not on PYTHONPATH")


@pytest.fixture(scope="session")
def demo_dir(tmp_path_factory):
    """A folder with the demo's GATES.tlm, CORES.tlm and demo.odb, written by tdm."""
    tdm = os.environ.get("LUMTDM_TDM")
    if not tdm:
        pytest.skip("LUMTDM_TDM (the tdm tool, which writes the demo) is not set")
    folder = tmp_path_factory.mktemp("demo")
    subprocess.run([tdm, "demo", "--quiet", "--dir", str(folder)], check=True,
                   stdout=subprocess.DEVNULL)
    return folder


@pytest.fixture
def demo_db(demo_dir, tmp_path):
    """A fresh copy of the demo database, opened; closed after the test."""
    path = tmp_path / "demo.odb"
    shutil.copy(demo_dir / "demo.odb", path)
    db = lumtdm.open(str(path), lib_path=[str(demo_dir)])
    yield db
    db.close()


def reopen(db, demo_dir):
    """Saves (committing), closes and opens the database again."""
    db.save()
    db.close()
    return lumtdm.open(db.path, lib_path=[str(demo_dir)])
