"""Every member behind a function: through the package and through ctypes with the same memory, to the same bytes."""
import warnings

import numpy as np
import pytest
import qori
from qori import _core

from cases import OPERATIONS, Case

SNAKES = sorted({m.operation.snake for m in OPERATIONS.values()})


def test_every_member_has_a_form_and_every_operation_a_function():
    members = _core._members()
    assert set(OPERATIONS) == {name for m in members for name in m[1:] if name}
    assert SNAKES == sorted({m[0] for m in members})
    assert all(getattr(qori, snake).__doc__ for snake in SNAKES)


def flat(result):
    """Numbers and positions as the C members order them: columns before rows."""
    if isinstance(result, np.ndarray):
        return [result]
    if not isinstance(result, tuple):
        return [result]
    return [item for part in result for item in flat(part)]


def wanted(case):
    """Results of the C call in the package's order."""
    found, results = [], list(case.results)
    while results:
        name, kind, values, several = results.pop(0)
        if name == "column":
            rows = results.pop(0)[2]
            for row, column in zip(rows, values):
                found += [row, column]
        else:
            found += list(values)
    return found


def equal(a, b):
    return np.asarray(a).tobytes() == np.asarray(b).tobytes() if isinstance(a, np.ndarray) else a == b or (a != a and b != b)


@pytest.mark.parametrize("snake", SNAKES)
def test_members_equal_c(snake):
    for name, member in sorted(OPERATIONS.items()):
        if member.operation.snake != snake:
            continue
        case = Case(member)
        assert _core._member(snake, **case.python) == name
        with warnings.catch_warnings(record=True) as raised:
            warnings.simplefilter("always")
            try:
                result, error = getattr(qori, snake)(**case.python), None
            except qori.Error as caught:
                result, error = None, caught
        status = case.call_c()
        assert (error.code if error else 0) == min(status, 0), (name, error)
        assert bool(raised) == (status > 0), name
        for mine, theirs in case.made:
            assert mine.tobytes() == theirs.tobytes(), name
        assert status >= 0, f"{name}: the case says nothing, status {status}"
        out = case.python.get("out", case.python.get("dst"))
        if case.results:
            values = flat(result)[2 * (member.operation.extent == "blocks"):]
            assert len(values) == len(wanted(case)) and all(map(equal, values, wanted(case))), (name, result, case.results)
        elif out is not None:
            assert result is out
