"""Status codes surface as exceptions with the code and the library's text;
files that cannot be opened as the OSError subclasses Python users know."""

import os
import pickle

import pytest

import tova
from tova import TovaError, UnitError
from tova.errors import check, status_name


def test_error_carries_status_name_and_context():
    err = TovaError(2003, "/data/run.vre")
    assert (err.status, err.name, err.context) == (2003, "F_ERR_OPEN", "/data/run.vre")
    assert str(err) == "/data/run.vre: the file could not be opened [F_ERR_OPEN, 2003]"

    odd = TovaError(4242)
    assert odd.name == "status 4242" and "unknown status code" in str(odd)
    assert "wrong size" in str(TovaError(2013, "x", "")) and "12 values" in str(TovaError(2013, "x", "12 values"))


def test_check_passes_success_and_raises_the_matching_class():
    check(0)
    with pytest.raises(TovaError) as info:
        check(2014, "f")
    assert info.value.status == 2014 and not isinstance(info.value, UnitError)
    with pytest.raises(UnitError) as info:
        check(2020)
    assert isinstance(info.value, ValueError) and status_name(info.value.status) == "F_ERR_UNIT"


def test_status_texts_are_the_librarys():
    assert str(TovaError(2003, "run.grd")) == "run.grd: the file could not be opened [F_ERR_OPEN, 2003]"
    assert TovaError(10000).name == "VRE_NOT_SET"


def test_files_that_cannot_be_opened_raise_the_familiar_errors(tmp_path):
    level = [tova.Item("level", "WaterLevel", "m")]
    calls = [(lambda: tova.open(tmp_path / "missing.grd"), FileNotFoundError, "missing.grd"),
             (lambda: tova.open(tmp_path), IsADirectoryError, str(tmp_path)),
             (lambda: tova.vre.read(tmp_path / "missing.vre"), FileNotFoundError, "missing.vre"),
             (lambda: tova.xsec.read(tmp_path), IsADirectoryError, str(tmp_path)),
             (lambda: tova.create(tmp_path, level, tova.TimeAxis.equidistant(1.0)), IsADirectoryError, str(tmp_path))]
    if os.geteuid() != 0:  # root may read anything
        locked = tmp_path / "locked.grd"
        locked.write_bytes(b"")
        locked.chmod(0)
        calls.append((lambda: tova.open(locked), PermissionError, "locked.grd"))
    for call, cls, name in calls:
        with pytest.raises(cls) as info:
            call()
        err = info.value
        assert isinstance(err, TovaError) and err.status >= 2000 and err.filename.endswith(name)
        assert name in str(err) and err.name in str(err)
        again = pickle.loads(pickle.dumps(err))  # as a dask worker sends it back
        assert type(again) is type(err) and str(again) == str(err) and again.errno == err.errno
