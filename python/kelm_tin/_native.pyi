from typing import Callable, Optional

import numpy as np
from numpy.typing import NDArray

__version__: str

class DataError(ValueError): ...

class Datum:
    __members__: dict[str, Datum]

class Surface:
    def __init__(
        self, points: NDArray[np.float32], triangles: NDArray[np.uint32], x_base: float, y_base: float
    ) -> None: ...
    @property
    def points(self) -> NDArray[np.float32]: ...
    @property
    def triangles(self) -> NDArray[np.uint32]: ...
    @property
    def base(self) -> tuple[float, float]: ...
    @property
    def box(self) -> list[float]: ...
    @property
    def nbytes(self) -> int: ...
    def height(self, x: float, y: float, closed: bool) -> float: ...
    def heights(
        self, positions: NDArray[np.float64], threads: int, closed: bool
    ) -> NDArray[np.float32]: ...
    def crossings(self, segments: NDArray[np.float64], threads: int) -> NDArray[np.float32]: ...
    def rasterize(
        self,
        columns: int,
        rows: int,
        transform: tuple[float, float, float, float, float, float],
        threads: int,
        closed: bool,
    ) -> NDArray[np.float32]: ...
    def subset(self, bounds: tuple[float, float, float, float]) -> Optional[Surface]: ...
    def along(self, line: NDArray[np.float64]) -> Optional[Surface]: ...

class LayerFacts:
    number: int
    refusal: str
    shapes: int
    box: list[float]
    crs: Optional[str]
    load_nbytes: int
    surface_nbytes: int

def read(
    file: str,
    layer: int,
    source: Datum,
    output: Datum,
    window: Optional[tuple[float, float, float, float]],
    base: Optional[tuple[float, float]],
    offset: float,
    scale: float,
    survey: bytes,
    progress: Optional[Callable[[int, int], object]],
    warnings: list[str],
) -> tuple[Optional[Surface], Optional[str]]: ...
def survey(
    file: str, layer: int, progress: Optional[Callable[[int, int], object]], warnings: list[str]
) -> tuple[LayerFacts, bytes]: ...
def count(
    file: str,
    layer: int,
    survey: bytes,
    windows: list[tuple[float, float, float, float]],
    warnings: list[str],
) -> list[int]: ...
def flatten_crs(wkt: str) -> Optional[str]: ...
def layers(file: str, warnings: list[str]) -> list[LayerFacts]: ...
