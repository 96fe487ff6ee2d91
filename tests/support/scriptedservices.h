#pragma once

#include "services/crs.h"
#include "services/vectorlayer.h"

#include <atomic>
#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace scripted {

/// Thrown where a script says so. Of no standard class, on which no caller may rely.
struct Failure {};

struct Shape {
    std::vector<ZARVertex> ring;
    enum { Good, Throws, Null } state = Good; ///< what ZARGetShapeRef does
};

/// What the test double of the outside services does and, below, what it has seen. (Exceptions,
/// mutex and interpolation grid need no script: they are the bundled ones.) Written by one thread
/// before the services are called; the records may then grow on any.
struct Script {
    int segmentCount = 1;
    int layerType = 4;
    bool hasLayer = true;
    bool isCountValid = true;
    std::optional<int> recordedCount; ///< of the layer record; empty: the true one
    std::vector<Shape> shapes;        ///< their ids are GetId of their positions
    ZARVertex low{-1e7, -1e7, -1e7};  ///< extents
    ZARVertex high{1e7, 1e7, 1e7};
    std::function<void()> onShape; ///< runs in ZARGetShapeRef
    bool hasCRS = true;
    bool isLocal = false;
    int dimension = 2;
    /// What a transform does to a triple: raises z by 1 and, to no effect, moves x and y.
    std::function<void(double*)> transform = [](double* p) { ++p[0], ++p[1], ++p[2]; };
    int failingCall = -1; ///< position in `calls` of the call that throws; -1: none

    std::vector<std::string> calls;           ///< those that may throw, in order
    std::vector<int> compounds;               ///< vertical datums of the compounds made
    std::vector<std::vector<double>> sources; ///< triples of each TransformPoints
    std::vector<std::string> warnings;        ///< text, space, source path
    std::vector<std::string> notes;
    std::atomic<int> openFiles{0};
    std::atomic<int> objects{0}; ///< living CRS objects and transforms

    static constexpr int FIRST_SEGMENT = 3;
    static int GetId(int position) { return 100 + 10 * position; }
};

/// @return a fresh script, in force until the next one; nothing served by the last may be left
Script& NewScript();

/// Marks its thread as working for the services, whose allocations an injector of allocation
/// failures leaves alone. FormatString, whose text belongs to the library, is not marked.
class Serving {
  public:
    Serving() { ++mnDepth; }
    Serving(const Serving&) = delete;
    Serving& operator=(const Serving&) = delete;
    ~Serving() { --mnDepth; }
    static bool IsServing() { return mnDepth > 0; }

  private:
    static inline thread_local int mnDepth = 0;
};

} // namespace scripted
