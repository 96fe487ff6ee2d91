// Writes the heights along a line over a terrain as a CSV. With --eye it also writes where the
// sight line from the first point to the last one meets the ground:
//
//     terrain_profile terrain.gpkg --line 741000,4048000,750000,4056000 --step 20 --eye 30
//
// A sight line is straight in map coordinates. It knows no curvature of the earth and no
// refraction.

#include "command.h"
#include "terrain.h"

#include <tin/aabbtree.h>

#include <cmath>
#include <optional>

using namespace kelm::tin;

namespace {

struct Options {
    std::vector<double> line; ///< x and y in turn
    double step = 0.0;
    std::optional<double> eye; ///< none: no sight line
    double target = 0.0;
};

using Position = point2_t<double>;
using Place = point3_t<double>;

struct Station {
    double distance; ///< from the start of the line
    Position position;
};

void DefineOptions(CLI::App& app, Options& options) {
    app.add_option("--line", options.line, "x1,y1,x2,y2 and so on")->delimiter(',')->required();
    app.add_option("--step", options.step, "Greatest distance between stations, in map units")
        ->required();
    app.add_option("--eye", options.eye, "Sight line from this height above the first point");
    app.add_option("--target", options.target, "to this height above the last point; else 0")
        ->needs("--eye");
}

void TestOptions(const Options& options) {
    if (options.line.size() < 4 || options.line.size() % 2 != 0)
        throw CLI::ValidationError("--line", "a line has two points x,y at least");
    if (!(options.step > 0.0))
        throw CLI::ValidationError("--step", "must be above 0");
    if (options.eye && !(*options.eye > 0.0 && options.target >= 0.0))
        throw CLI::ValidationError("--eye", "must be above 0, and the target not below it");
}

/// The points of a line and, between them, stations at most a step apart.
std::vector<Station> PlaceStations(const std::vector<double>& line, double step) {
    std::vector<Station> stations{{0.0, {line[0], line[1]}}};
    for (std::size_t i = 2; i < line.size(); i += 2) {
        const auto [start, from] = stations.back();
        const double length = std::hypot(line[i] - from.x, line[i + 1] - from.y);
        const double parts = std::max(1.0, std::ceil(length / step));
        if (parts > 1e6)
            throw std::runtime_error("the step is too small: more than a million stations");
        for (double share = 1.0; share <= parts; ++share)
            stations.push_back({start + length * share / parts,
                                {from.x + (line[i] - from.x) * share / parts,
                                 from.y + (line[i + 1] - from.y) * share / parts}});
    }
    return stations;
}

/// The terrain under a line, with an index of its own. The strip is cut along the stretches between
/// stations, so a query on such a stretch finds the same triangles in the strip as in the terrain.
struct Strip {
    Strip(const Tin& terrain, const AabbTree& index, const std::vector<Station>& stations)
        : surface(Cut(terrain, index, stations)), tree(surface.get()) {}

    static Tin* Cut(const Tin& terrain, const AabbTree& index,
                    const std::vector<Station>& stations) {
        std::vector<Position> points;
        for (const Station& station : stations)
            points.push_back(station.position);
        Tin* strip =
            terrain.SubsetByLineString(points.data(), static_cast<unsigned>(points.size()), &index);
        return strip ? strip : throw std::runtime_error("the line does not touch the terrain");
    }

    bool GetGround(const Position& at, float& height) const {
        return surface->GetHeight(at.x, at.y, height, &tree);
    }

    /// Does the line meet the ground, or does it end below ground? Rounding can hide a crossing at
    /// the edge of two triangles; then the line ends below ground.
    bool TestMeeting(const Place& a, const Place& b) const {
        float height;
        return surface->GetLineIntersectHeight(a, b, height, &tree) ||
               (GetGround({b.x, b.y}, height) && static_cast<double>(height) >= b.z);
    }

    const std::unique_ptr<const Tin> surface;
    const AabbTree tree;
};

void PrintRow(const char* what, double distance, const Place& place) {
    std::printf("%s,%.3f,%.3f,%.3f,%.3f\n", what, distance, place.x, place.y, place.z);
}

void PrintProfile(const Strip& strip, const std::vector<Station>& stations) {
    for (const auto& [distance, at] : stations) {
        float height;
        if (strip.GetGround(at, height))
            PrintRow("ground", distance, {at.x, at.y, static_cast<double>(height)});
        else
            std::printf("ground,%.3f,%.3f,%.3f,\n", distance, at.x, at.y);
    }
}

/// The straight line from the eye to the target, station by station.
std::vector<Place> PlaceSight(const Strip& strip, const std::vector<Station>& stations,
                              const Options& options) {
    float first;
    float last;
    if (!strip.GetGround(stations.front().position, first) ||
        !strip.GetGround(stations.back().position, last))
        throw std::runtime_error("no ground below the eye or the target");
    if (stations.back().distance == 0.0)
        throw std::runtime_error("the sight line has no length");
    const double eye = static_cast<double>(first) + *options.eye;
    const double rise = static_cast<double>(last) + options.target - eye;
    std::vector<Place> sight;
    for (const auto& [distance, at] : stations)
        sight.push_back({at.x, at.y, eye + rise * distance / stations.back().distance});
    return sight;
}

/// A crossing query gives the highest crossing of a line, which need not be the first one. So the
/// line is tried stretch by stretch from the eye on. The first stretch that meets the ground is
/// halved until it is shorter than a thousandth of the step. A crossing that close to the target
/// counts as the target.
void PrintSight(const Strip& strip, const std::vector<Station>& stations, const Options& options) {
    const std::vector<Place> sight = PlaceSight(strip, stations, options);
    PrintRow("eye", 0.0, sight.front());
    std::size_t k = 1;
    while (k < sight.size() && !strip.TestMeeting(sight[k - 1], sight[k]))
        ++k;
    if (k == sight.size())
        return PrintRow("clear", stations.back().distance, sight.back());

    Place low = sight[k - 1];
    Place high = sight[k];
    for (int halving = 0; halving < 10; ++halving) {
        const Place middle{(low.x + high.x) / 2.0, (low.y + high.y) / 2.0, (low.z + high.z) / 2.0};
        (strip.TestMeeting(low, middle) ? high : low) = middle;
    }
    const double distance = std::hypot(high.x - sight.front().x, high.y - sight.front().y);
    const bool seen = stations.back().distance - distance < options.step / 1000.0;
    PrintRow(seen ? "clear" : "blocked", distance, high);
}

void Run(const Layer& layer, const Options& options) {
    TestOptions(options);
    const std::unique_ptr<Tin> terrain = LoadTerrain(layer);
    const AabbTree tree(terrain.get());
    const std::vector<Station> stations = PlaceStations(options.line, options.step);
    std::puts("what,distance,x,y,height");
    PrintProfile(Strip(*terrain, tree, stations), stations);
    if (options.eye) {
        const std::vector<double>& line = options.line;
        const auto straight = PlaceStations(
            {line[0], line[1], line[line.size() - 2], line[line.size() - 1]}, options.step);
        PrintSight(Strip(*terrain, tree, straight), straight, options);
    }
}

} // namespace

int main(int argc, char** argv) {
    Layer layer;
    Options options;
    CLI::App app("Heights along a line over a terrain, and the sight along it.", "terrain_profile");
    AddLayerOptions(app, layer);
    DefineOptions(app, options);
    return RunCommand(app, argc, argv, [&] { Run(layer, options); });
}
