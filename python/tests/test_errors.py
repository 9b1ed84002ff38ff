"""Status codes surface as exceptions with the code and a readable text."""

import pytest

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
