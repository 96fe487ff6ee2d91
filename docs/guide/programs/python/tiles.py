import sys

import dask.array
import kelm_tin
from distributed import Client, LocalCluster


def main():
    plan = kelm_tin.tiles.Plan(sys.argv[1], tile=2000.0, source="orthometric")
    print(f"{plan.tiles[0]} x {plan.tiles[1]} tiles, at most {plan.estimate / 1e6:.0f} MB each")

    cells = kelm_tin.tiles.raster(plan, cell=20.0)
    kelm_tin.tiles.write_geotiff(cells, sys.argv[2])
    highest = dask.array.nanmax(cells).compute()
    print(f"{cells.shape[0]} x {cells.shape[1]} cells, the highest at {highest:.1f} m")

    heights = kelm_tin.tiles.heights(plan, [[745000, 4052000], [743926, 4055451], [0, 0]])
    print(heights.compute())


if __name__ == "__main__":  # the workers import this file, too
    with LocalCluster(n_workers=2, threads_per_worker=1, dashboard_address=None) as cluster:
        with Client(cluster):
            main()
