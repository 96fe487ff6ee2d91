"""What is used of Dask, whose types are incomplete."""

from importlib import import_module
from typing import Any

_dask: Any = import_module("dask")
_array: Any = import_module("dask.array")
_base: Any = import_module("dask.base")

Array: Any = _array.Array
from_array: Any = _array.from_array
compute: Any = _dask.compute
delayed: Any = _dask.delayed
tokenize: Any = _base.tokenize
get_scheduler: Any = _base.get_scheduler
join_graphs: Any = import_module("dask.highlevelgraph").HighLevelGraph.from_collections
