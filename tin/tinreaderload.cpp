#include "tin/tinreader.h"

#include "services/exception.h"
#include "services/reporting.h"
#include "services/vectorlayer.h"
#include "tin/detail/polygon.h"
#include "tin/load/assembly.h"
#include "tin/load/weld.h"
#include "tin/load/welder.h"
#include "tin/triangulate.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <limits>
#include <memory>

namespace kelm::tin {

namespace {

using containers::KeyPoint;
using Window = BBox<double, point2_t<double>>;

/// Holds a mutex for a scope.
class ScopedLock {
  public:
    explicit ScopedLock(const threading::Mutex& rMutex) : mrMutex(rMutex) { mrMutex.Lock(); }
    ScopedLock(const ScopedLock&) = delete;
    ScopedLock& operator=(const ScopedLock&) = delete;
    ~ScopedLock() { mrMutex.Unlock(); }

  private:
    const threading::Mutex& mrMutex;
};

/// Tells the store the window of a walk, if the store asks for it.
class ToldWindow {
  public:
    ToldWindow(ZARLayer_t* layer, const Window* window) {
        if (window == nullptr || ZARSetWindow == nullptr)
            return;
        const ZARVertex low{window->min.x, window->min.y, 0.0};
        const ZARVertex high{window->max.x, window->max.y, 0.0};
        ZARSetWindow(layer, &low, &high);
        mpLayer = layer;
    }
    ToldWindow(const ToldWindow&) = delete;
    ToldWindow& operator=(const ToldWindow&) = delete;
    ~ToldWindow() {
        if (mpLayer != nullptr)
            ZARSetWindow(mpLayer, nullptr, nullptr);
    }

  private:
    ZARLayer_t* mpLayer = nullptr; ///< null if nothing was told
};

// Shares of a load that is done when the shapes are read, and when they are welded. Most layers are
// welded while they are read.
constexpr double READ = 0.8;
constexpr double WELDED = 0.9;

/// Tells the progress of the walk over shapes. A window leaves some of them out, so the walk may
/// end early.
class ReadMeter {
  public:
    ReadMeter(const Progress& progress, int shapes)
        : moProgress(progress), mnStep(1 + shapes / 100), mdfShapes(shapes) {}

    void Count() {
        if (mnDone++ % mnStep == 0)
            moProgress.Report(READ * std::min(static_cast<double>(mnDone) / mdfShapes, 1.0),
                              "reading shapes");
    }

  private:
    Progress moProgress;
    std::int64_t mnStep;
    std::int64_t mnDone = 0;
    double mdfShapes;
};

/// The shape, or null if the store cannot deliver it. A store that throws has told why.
const ZARShape* FindShape(ZARLayer_t* layer, int id) {
    const ZARShape* shape = nullptr;
    try {
        shape = ZARGetShapeRef(layer, id);
    } catch (...) {
        return nullptr;
    }
    if (shape == nullptr)
        tellus::Warning::Warn(FormatString("Shape# %d is ignored because the store has none.", id),
                              "tin/tinreader", __LINE__);
    return shape;
}

/// Whatever fails in a weld, the caller gets one exception.
template <typename Function>
load::Welded TryWeld(const Function& weld) {
    try {
        return weld();
    } catch (...) {
        throw Exception("Octree2 error", "tin/tinreader", __PRETTY_FUNCTION__, __LINE__);
    }
}

/// Positions of such a surface would not be numbers.
void TestBase(const LoadOptions& options) {
    if (options.base && !(std::isfinite(options.base->x) && std::isfinite(options.base->y)))
        throw ParameterException("base", ParameterException::PT_Invalid,
                                 FormatString("%g, %g", options.base->x, options.base->y),
                                 "finite numbers", "The XY base of a load must be finite",
                                 "tin/tinreader", __PRETTY_FUNCTION__, __LINE__);
}

/// Notes if a base costs more than a thousandth of a map unit. @param box of the surface,
/// surface-local
void ReportFarBase(const point2_t<double>& base, const aabb_t<point2_t<float>>& box) {
    constexpr double MOST_SPACING = 0.001;
    const float far = std::max(
        {std::fabs(box.min.x), std::fabs(box.min.y), std::fabs(box.max.x), std::fabs(box.max.y)});
    const double spacing =
        static_cast<double>(std::nextafter(far, std::numeric_limits<float>::infinity()) - far);
    if (!(spacing <= MOST_SPACING)) // beyond the range of float it is no number
        tellus::Report::AddInfo(FormatString(
            "The surface reaches %.0f map units from its base %.3f, %.3f: neighbouring positions "
            "there are %.2g map units apart",
            static_cast<double>(far), base.x, base.y, spacing));
}

} // namespace

Tin* TinReader::Load(const Window* poWindow) {
    return Load(poWindow, {});
}

Tin* TinReader::Load(const Window* poWindow, const LoadOptions& oOptions) {
    TestBase(oOptions);
    if (mnShapeCount < 1 || (poWindow != nullptr && !TestOverlap(*poWindow, moBBox)))
        return nullptr;
    const ScopedLock lock(moMutex);
    const ToldWindow told(mpLayer, poWindow);
    const bool isPart = poWindow != nullptr;
    load::Welder corners(isPart ? EstimateShapeCount(*poWindow) : mnShapeCount, isPart);
    ReadMeter meter(oOptions.progress, mnShapeCount);
    for (int id = ZARGetNext(mpLayer, -1); id != -1; id = ZARGetNext(mpLayer, id)) {
        meter.Count();
        ReadShape(id, poWindow, corners);
    }
    oOptions.progress.Report(READ, "welding corners");
    load::Welded welded = TryWeld([&] { return corners.Finish(); });
    return AssembleTin(welded, oOptions);
}

std::string TinReader::GetSurvey() const {
    if (mpLayer == nullptr || ZARGetSurvey == nullptr)
        return {};
    const ScopedLock lock(moMutex);
    return ZARGetSurvey(mpLayer);
}

int TinReader::EstimateShapeCount(const Window& oWindow) const {
    if (mpLayer == nullptr || ZARCountShapes == nullptr)
        return mnShapeCount;
    const ZARVertex low{oWindow.min.x, oWindow.min.y, 0.0};
    const ZARVertex high{oWindow.max.x, oWindow.max.y, 0.0};
    return ZARCountShapes(mpLayer, &low, &high);
}

std::string TinReader::GetCRSText() const {
    if (mpLayer == nullptr)
        return {};
    const ScopedLock lock(moMutex);
    ProjInfo_t info{};
    ZARGetProjectionInfo(mpLayer, &info);
    return info.definition;
}

void TinReader::ReadShape(int id, const Window* poWindow, load::Welder& rCorners) const {
    const ZARShape* shape = FindShape(mpLayer, id);
    if (shape == nullptr)
        return;
    if (poWindow == nullptr && shape->vertexCount == 4) {
        rCorners.AddTriangle(*shape);
        return;
    }
    const Polygon<double> polygon(shape, PO_Undefined);
    if (poWindow != nullptr && !polygon.IsIntersected(*poWindow))
        return;
    if (shape->vertexCount == 4) {
        rCorners.AddTriangle(*shape);
        return;
    }
    load::Welder::Ring& ring = rCorners.GetEmptyRing();
    if (Triangulate(polygon, ring.triangles) != 0) {
        tellus::Warning::Warn(
            FormatString("Triangulate(): Polygon# %d is ignored becasue it is not simple.\n", id),
            "tin/tinreader", __LINE__);
        return;
    }
    detail::FindRingVertices(*shape, ring.vertices);
    rCorners.AddRing(*shape, ring);
}

Tin* TinReader::CreateTin(std::vector<KeyPoint<double>>& oPoints, std::vector<Triangle_Id>& oIds) {
    if (oPoints.empty() || oIds.empty())
        return nullptr;
    load::Welded welded = TryWeld([&] { return load::Weld(oPoints, oIds); });
    return AssembleTin(welded, {});
}

Tin* TinReader::AssembleTin(load::Welded& rWelded, const LoadOptions& oOptions) {
    if (rWelded.triangles.empty())
        return nullptr;
    oOptions.progress.Report(WELDED, "making the surface");
    load::Assembly parts = load::Assemble(rWelded, oOptions.base);
    mdfXBase = parts.base.x;
    mdfYBase = parts.base.y;
    const aabb_t<point2_t<float>> oBox = load::ComputeBox(parts);
    if (oOptions.base)
        ReportFarBase(parts.base, oBox);
    (this->*mpfnHeightConvert)(&oBox, parts.vertices.get(), parts.vertexCount);
    oOptions.progress.Report(1.0, "done"); // a stop still finds an owner for the parts
    auto surface =
        std::make_unique<Tin>(parts.vertices.get(), parts.vertexCount, parts.triangles.get(),
                              parts.triangleCount, mdfXBase, mdfYBase);
    static_cast<void>(parts.vertices.release());
    static_cast<void>(parts.triangles.release());
    return surface.release();
}

} // namespace kelm::tin
