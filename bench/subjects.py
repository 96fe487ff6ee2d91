"""What is measured: the sections of docs/benchmarks.md."""

# Title, key, unit of a figure (factor on nanoseconds an item, text), workload in words.
SUBJECTS = [
    ("Build", "build", (1, "ns a triangle"),
     "An index over a terrain in memory. Each library builds from its own form: our triangles, "
     "CGAL's triangles, Embree's shared buffers, and a vector of boxes for Boost. The time to "
     "release the index is not counted. Terrains are fractal. Their nodes are 10 m apart with 3 "
     "m of jitter, with two triangles in a cell, in row order or shuffled. `jacksboro` is real "
     "(17,619 triangles). `same` is so many copies of one triangle. In `crowded` vertices crowd "
     "towards a corner of the box by powers of two."),
    ("Memory of an index", "memory", (0, "bytes a triangle"),
     "Resident memory that a build adds, at its peak and afterwards, beyond what it is built "
     "from. Each build runs in a process of its own."),
    ("Degenerate surfaces", "degenerate", (1e-6, "ms"),
     "Our index over a million triangles (100k if `quick`). Each figure is one call. `same` and "
     "`crowded` are as above. `vertical` has upright triangles on a diagonal. `tower` has "
     "growing triangles over one point. `slivers` are 10,000 km long, side by side. In `far` "
     "each triangle spans the range of `float`. The height is that in the middle of the "
     "surface's box. The crossing is that of the box's diagonal."),
    ("Heights along scanlines", "height/scanline", (1, "ns a height"),
     "The greatest height at a million positions, row by row over the whole extent, one call for "
     "each position. CGAL lists the triangles that a plumb line meets. Boost lists those whose "
     "box holds the position. From both lists the highest is taken. Embree casts a ray down, "
     "with its robust flag. In its first column the first hit is the highest. In its second "
     "column a filter lists all hits."),
    ("Heights along fine scanlines", "height/fine", (1, "ns a height"),
     "The same at a million positions 2.24 m apart. On each terrain there are ten positions in a "
     "triangle, so they cross only a part of the larger terrains."),
    ("Heights at random positions", "height/random", (1, "ns a height"),
     "The same at a million positions in random order."),
    ("Highest crossing of short segments", "line/2%", (1e-3, "µs a segment"),
     "20,000 lines of sight. Each is 2 % of the extent long. It starts 1 m above the ground. It "
     "ends 1 m, plus up to 5 % of its length, above the ground. Our index and Boost's know only "
     "the plan, and visit every triangle below the segment. Those of CGAL and Embree are "
     "three-dimensional, and visit the triangles whose box the segment passes through. Embree "
     "takes the first hit from the higher end."),
    ("Highest crossing of long segments", "line/50%", (1e-3, "µs a segment"),
     "The same for 2,000 segments of 50 % of the extent."),
    ("Lines by a crossing tree, short", "crossing/2%", (1e-3, "µs a segment"),
     "The segments of the two tables above by a `CrossingTree`, one by one and as a batch on one "
     "thread, beside the surface with its tree and Embree's robust scene, where a filter keeps the "
     "highest of all hits; Embree takes them one by one, in packets of eight, and as a stream."),
    ("Lines by a crossing tree, long", "crossing/50%", (1e-3, "µs a segment"), "The same."),
    ("Heights by a height grid, scanlines", "heights/scanline", (1, "ns a height"),
     "The positions of the tables above by a `HeightGrid`: a batch on one thread (ours), single "
     "calls, the closed rule, and the surface with its tree. Embree takes them as a stream and in "
     "packets of eight."),
    ("Heights by a height grid, at random", "heights/random", (1, "ns a height"), "The same."),
    ("Two threads: heights", "threads/heights", (1, "ns a height"),
     "By the clock on the wall, on two cores. A batch of a million random positions."),
    ("Two threads: crossings", "threads/crossings", (1e-3, "µs a segment"),
     "Batches of the short segments."),
    ("Two threads: raster", "threads/raster", (1e-6, "ms a raster"), "The raster below."),
    ("Two threads: build of a height grid", "threads/build", (1, "ns a triangle"), "As above."),
    ("Two threads: build of a crossing tree", "threads/build of a crossing tree",
     (1, "ns a triangle"), "As above."),
    ("Two threads: build of an AabbTree", "threads/build of an AabbTree", (1, "ns a triangle"),
     "As above."),
    ("Python, random positions", "python/random", (1, "ns a height"),
     "A million positions over a Delaunay triangulation of 100k triangles by scipy, in one call on "
     "one thread. scipy's LinearNDInterpolator and matplotlib's LinearTriInterpolator have the same "
     "triangles. The C++ batch is the same call below Python. The index was built before."),
    ("Python, scanlines", "python/scanline", (1, "ns a height"), "The same, row by row."),
    ("Python, one position", "python/one position", (1e-3, "µs a call"),
     "`surface.heights(x, y)` for a single position."),
    ("Heights without an index", "scan", (1e-3, "µs a height"),
     "One height by a scan of all triangles, beside reading one word of each cache line of the "
     "array of triangles."),
    ("Welding", "weld", (1, "ns a corner"),
     "Three corners for each triangle, in map coordinates, 24 bytes each. For every corner it "
     "finds the first one within 1e-9 on each axis. meshoptimizer finds the first one with the "
     "same bits. In `twins` one corner in a thousand is moved by the smallest step of a double. "
     "`ours, corners to surface` adds what follows in a load: vertices, triangles and their "
     "boxes."),
    ("Rings, star-shaped", "ring/star", (1e-3, "µs a ring"),
     "Rings of 4 to 500 corners around a centre. Each is tested for being simple and cut into "
     "triangles. GEOS uses isSimple and PolygonTriangulator on a polygon made beforehand. CGAL "
     "uses constrained Delaunay. Ours starts from the vertices of a shape."),
    ("Rings, wiggly", "ring/wiggly", (1e-3, "µs a ring"),
     "The same for bands that go up and down at each step."),
    ("Large rings", "ring/large", (1e-6, "ms a ring"),
     "One ring of 100,000 corners, the coast of 131,072. The teeth of the comb are 1 to 1000 m "
     "high and 2 m wide, those of the sawtooth up to 1 m high. Not among them: two dense rows of "
     "slanted edges, which take 18 s, as [the guide](guide/rings.md) explains."),
    ("Whole surface to a raster", "raster", (1e-6, "ms a raster"),
     "2000 x 2000 cells over the whole terrain, with the greatest height in each, from triangles "
     "in grid coordinates. Embree casts a ray for each cell; its index is built beforehand. The "
     "row walks are plain loops in `double` over the triangles. One tests and weights each cell "
     "of a row. The other takes the cells for inside and steps along the plane. GDAL "
     "triangulates the vertices anew."),
    ("Loading, GeoPackage", "load/GPKG", (1e-9, "s"),
     "Triangles as polygons with heights, each file in a process of its own. The time is the "
     "processor time of opening a reader and its first load, beside one loop over all features "
     "that reads each corner and keeps nothing. The second load of the same reader reads the "
     "file again; how long that takes alone is measured by a walk over the store's shapes."),
    ("Loading, FlatGeobuf", "load/FlatGeobuf", (1e-9, "s"), "The same."),
    ("Loading, Shapefile", "load/ESRI Shapefile", (1e-9, "s"), "The same."),
    ("Windows, GeoPackage", "window/GPKG", (1e-9, "s"),
     "The processor time of `Load` alone, for a window of a hundredth of the area and for the "
     "whole layer, each in a process of its own. The reader was opened with a survey, so both "
     "loads read the file."),
    ("Windows, FlatGeobuf", "window/FlatGeobuf", (1e-9, "s"), "The same."),
    ("Windows, Shapefile", "window/ESRI Shapefile", (1e-9, "s"), "The same."),
]
