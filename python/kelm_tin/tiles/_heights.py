"""Heights at positions, sorted by tile."""

from __future__ import annotations

from operator import getitem
from typing import Any

import numpy as np

from .._arrays import FloatArray, to_coordinates
from ._dask import Array, compute, delayed, from_array, join_graphs, tokenize
from ._plan import Plan
from ._work import answer

BLOCK = 1 << 20
"""Positions of a numpy array that go together."""
Counts = dict[int, int]


def heights(plan: Plan, xy: Any, *, closed: bool = False) -> Any:
    """The greatest height at each position. Each tile is loaded once, whatever the order of positions.

    To know which tile needs which positions, the call looks at all positions once: positions in a dask
    array or dataframe are computed now, block by block, and again when the answers are.

    Args:
        xy: (n, 2) map coordinates as a numpy or dask array; or a pandas or dask dataframe with the columns
            x and y.
        closed: give a position on an edge a height even if rounding puts it beside both triangles.

    Returns:
        In the order of the positions, NaN off the surface: a dask array of shape (n,) and `float32`, or for
        a dataframe a dask series with its index.

    Raises:
        ValueError: positions of another shape or dtype.
        TileError: when it is computed: a tile could not be answered.

    >>> plan = Plan("data/jacksboro.gpkg", tile=2000.0)
    >>> heights(plan, [[745000.0, 4052000.0], [0.0, 0.0]]).compute()
    array([752.4963,      nan], dtype=float32)
    """
    if hasattr(xy, "columns"):
        return _answer_frame(plan, xy, closed)
    array = xy if isinstance(xy, Array) else from_array(_to_rows(xy), chunks=(BLOCK, 2))
    if array.ndim != 2 or array.shape[1] != 2:
        raise ValueError(f"xy: expected shape (n, 2), got {array.shape}")
    blocks = array.rechunk({1: 2}).to_delayed().ravel().tolist()
    layer, name, counts = _lay_out(plan, blocks, closed)
    sizes = tuple(sum(each.values()) for each in counts)
    return Array(join_graphs(name, layer, blocks), name, (sizes,), np.float32)


def _answer_frame(plan: Plan, frame: Any, closed: bool) -> Any:
    import dask.dataframe
    import pandas as pd  # type: ignore[import]

    dd: Any = dask.dataframe
    if isinstance(frame, pd.DataFrame):
        frame = dd.from_pandas(frame, chunksize=BLOCK, sort=False)
    missing = {"x", "y"} - set(frame.columns)
    if missing:
        raise ValueError(f"xy: the dataframe has no column {min(missing)}")
    blocks = frame[["x", "y"]].to_delayed()
    layer, name, _ = _lay_out(plan, blocks, closed)
    meta = pd.Series([], dtype=np.float32, name="height", index=frame._meta.index)
    return dd.Series(join_graphs(name, layer, blocks), name, meta, frame.divisions)


def _lay_out(plan: Plan, blocks: list[Any], closed: bool) -> tuple[dict[Any, Any], str, list[Counts]]:
    """The tasks: split each block by tile, answer each tile, and join the answers of each block."""
    value = delayed(plan, traverse=False)
    counts: list[Counts] = list(compute(*[delayed(_count)(value, block) for block in blocks]))
    token = tokenize(plan, closed, [block.key for block in blocks])
    key, name = "kelm-tin-plan-" + token, "kelm-tin-heights-" + token
    split, pick, tile, give = (f"kelm-tin-{what}-{token}" for what in ("split", "pick", "tile", "give"))
    layer: dict[Any, Any] = {key: plan}
    users: dict[int, list[int]] = {}
    for i, block in enumerate(blocks):
        layer[(split, i)] = (_split, key, block.key)
        for number in counts[i]:
            layer[(pick, i, number)] = (getitem, (split, i), number)
            layer[(give, i, number)] = (getitem, (tile, number), len(users.setdefault(number, [])))
            users[number].append(i)
        answers = [(give, i, number) for number in sorted(counts[i])]
        layer[(name, i)] = (_join, key, block.key, answers)
    for number, where in users.items():
        layer[(tile, number)] = (answer, key, closed, number, [(pick, i, number) for i in where])
    return layer, name, counts


def _to_rows(block: Any) -> FloatArray:
    """(n, 2) positions of an array or of a dataframe."""
    if hasattr(block, "columns"):
        block = block[["x", "y"]].to_numpy()
    rows = to_coordinates("xy", block, 2)
    if rows.ndim != 2:
        raise ValueError(f"xy: expected shape (n, 2), got {rows.shape}")
    return rows


def _count(plan: Plan, block: Any) -> Counts:
    """How many positions lie in each tile that has some."""
    numbers, counts = np.unique(plan.find(_to_rows(block)), return_counts=True)
    return dict(zip(numbers.tolist(), counts.tolist()))


def _split(plan: Plan, block: Any) -> dict[int, FloatArray]:
    """The positions of each tile, in the order in which they stand in the block."""
    rows = _to_rows(block)
    numbers = plan.find(rows)
    order = np.argsort(numbers, kind="stable")
    found, starts = np.unique(numbers[order], return_index=True)
    return dict(zip(found.tolist(), np.split(rows[order], starts[1:])))


def _join(plan: Plan, block: Any, answers: list[Any]) -> Any:
    """Brings the answers of a block, tile by tile, into the order of its positions."""
    order = np.argsort(plan.find(_to_rows(block)), kind="stable")
    found = np.empty(len(order), np.float32)
    if answers:
        found[order] = np.concatenate(answers)
    if not hasattr(block, "columns"):
        return found
    import pandas as pd

    return pd.Series(found, index=block.index, name="height")
