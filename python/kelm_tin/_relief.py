"""A small picture of a surface for notebooks."""

from __future__ import annotations

import io
from typing import TYPE_CHECKING, Optional

import numpy as np

if TYPE_CHECKING:
    from ._surface import Surface

LONG_SIDE = 320
"""Pixels of the longer side."""


def make_png(surface: Surface) -> Optional[bytes]:
    """Makes a shaded relief. None if matplotlib is not installed or the surface has no extent."""
    try:
        from matplotlib import cm, image  # type: ignore[import]
        from matplotlib.colors import LightSource  # type: ignore[import]
    except ImportError:
        return None
    xmin, ymin, xmax, ymax = surface.bounds
    side = max(xmax - xmin, ymax - ymin) / LONG_SIDE
    if not side > 0:
        return None
    # The shade of a cell is found from its neighbours, so there must be two rows and two columns.
    columns, rows = (max(2, round(length / side)) for length in (xmax - xmin, ymax - ymin))
    dx, dy = (xmax - xmin) / columns, (ymax - ymin) / rows
    heights = surface._native.rasterize(columns, rows, (xmin, dx, 0.0, ymax, 0.0, -dy), 0, True)
    there = np.isfinite(heights)
    if not there.any():
        return None
    filled = np.where(there, heights, heights[there].mean())
    picture = LightSource().shade(
        filled, cm.ScalarMappable(cmap="gist_earth").get_cmap(), dx=dx, dy=dy, blend_mode="soft"
    )
    picture[..., 3] = there
    out = io.BytesIO()
    image.imsave(out, picture, format="png")
    return out.getvalue()
