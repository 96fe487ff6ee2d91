#include "bench/peers.h"
#include "bench/workload.h"

#include <embree3/rtcore.h>

#include <algorithm>
#include <limits>
#include <stdexcept>
#include <utility>
#include <vector>

namespace kelm::bench {

namespace {

/// One for all scenes; builds run in the calling thread.
RTCDevice GetDevice() {
    static const std::unique_ptr<RTCDeviceTy, void (*)(RTCDevice)> poDevice(
        rtcNewDevice("threads=1"), rtcReleaseDevice);
    if (poDevice == nullptr)
        throw std::runtime_error("Embree: no device");
    return poDevice.get();
}

/// What both uses of Embree work on: the terrain's own arrays, but for the 4 bytes that must be
/// readable behind the last vertex.
struct SceneInput {
    std::vector<point3_t<float>> oVertices;
    std::vector<Triangle_Id> oTriangles;
};

void Fill(const Terrain& oTerrain, SceneInput& rInput) {
    rInput.oVertices = oTerrain.oVertices;
    rInput.oVertices.push_back({0.0F, 0.0F, 0.0F});
    rInput.oTriangles = oTerrain.oTriangles;
}

/// A robust scene of default build quality over the arrays as they are.
class Scene {
  public:
    Scene(const SceneInput& oInput, RTCSceneFlags eFlags) : mpoScene(rtcNewScene(GetDevice())) {
        rtcSetSceneFlags(mpoScene, eFlags);
        RTCGeometry geometry = rtcNewGeometry(GetDevice(), RTC_GEOMETRY_TYPE_TRIANGLE);
        rtcSetSharedGeometryBuffer(geometry, RTC_BUFFER_TYPE_VERTEX, 0, RTC_FORMAT_FLOAT3,
                                   oInput.oVertices.data(), 0, sizeof(point3_t<float>),
                                   oInput.oVertices.size() - 1);
        rtcSetSharedGeometryBuffer(geometry, RTC_BUFFER_TYPE_INDEX, 0, RTC_FORMAT_UINT3,
                                   oInput.oTriangles.data(), 0, sizeof(Triangle_Id),
                                   oInput.oTriangles.size());
        rtcCommitGeometry(geometry);
        rtcAttachGeometry(mpoScene, geometry);
        rtcReleaseGeometry(geometry);
        rtcCommitScene(mpoScene);
        if (rtcGetDeviceError(GetDevice()) != RTC_ERROR_NONE)
            throw std::runtime_error("Embree: the scene was not built");
        RTCBounds bounds;
        rtcGetSceneBounds(mpoScene, &bounds);
        mfTop = bounds.upper_z + 1.0F;
        mfDepth = mfTop - bounds.lower_z + 1.0F;
    }
    Scene(const Scene&) = delete;
    Scene& operator=(const Scene&) = delete;
    ~Scene() { rtcReleaseScene(mpoScene); }

    /// A ray down through a position, over the whole height of the scene.
    RTCRayHit DropRay(float x, float y) const {
        return MakeRay({x, y, mfTop}, {0.0F, 0.0F, -1.0F}, mfDepth);
    }

    static RTCRayHit MakeRay(const point3_t<float>& a, const point3_t<float>& direction,
                             float fLength) {
        RTCRayHit ray{};
        ray.ray.org_x = a.x;
        ray.ray.org_y = a.y;
        ray.ray.org_z = a.z;
        ray.ray.dir_x = direction.x;
        ray.ray.dir_y = direction.y;
        ray.ray.dir_z = direction.z;
        ray.ray.tfar = fLength;
        ray.ray.mask = ~0U;
        ray.hit.geomID = RTC_INVALID_GEOMETRY_ID;
        return ray;
    }

    RTCScene Get() const { return mpoScene; }

  private:
    RTCScene mpoScene;
    float mfTop;
    float mfDepth;
};

/// The first hit of a ray. @return its parameter along the ray, or -1
float FindFirst(const Scene& oScene, RTCRayHit& rRay) {
    RTCIntersectContext context;
    rtcInitIntersectContext(&context);
    rtcIntersect1(oScene.Get(), &context, &rRay);
    return rRay.hit.geomID == RTC_INVALID_GEOMETRY_ID ? -1.0F : rRay.ray.tfar;
}

/// A query that lists the parameters of all hits. The filter refuses each, so that the search goes
/// on behind it.
struct HitList {
    RTCIntersectContext oContext; ///< first, so that the filter finds the rest
    std::vector<float> oHits;
};

void ListHit(const RTCFilterFunctionNArguments* poArgs) {
    auto* list = reinterpret_cast<HitList*>(poArgs->context);
    list->oHits.push_back(RTCRayN_tfar(poArgs->ray, poArgs->N, 0));
    poArgs->valid[0] = 0;
}

/// @return the parameters of all hits; good until the next call
const std::vector<float>& FindAll(const Scene& oScene, RTCRayHit& rRay) {
    static HitList list;
    rtcInitIntersectContext(&list.oContext);
    list.oContext.filter = ListHit;
    list.oHits.clear();
    rtcIntersect1(oScene.Get(), &list.oContext, &rRay);
    return list.oHits;
}

const auto WITH_FILTER = RTC_SCENE_FLAG_ROBUST | RTC_SCENE_FLAG_CONTEXT_FILTER_FUNCTION;

} // namespace

template <>
struct Index<Embree>::Input : SceneInput {};
template <>
struct Index<EmbreeHits>::Input : SceneInput {};

template <>
struct Index<Embree>::Tree : Scene {
    using Scene::Scene;
};
template <>
struct Index<EmbreeHits>::Tree : Scene {
    using Scene::Scene;
};

template <>
const char* Index<Embree>::GetName() {
    return "Embree, first hit";
}
template <>
const char* Index<EmbreeHits>::GetName() {
    return "Embree, list of hits";
}

template <>
std::shared_ptr<const Index<Embree>::Input>
Index<Embree>::Prepare(const std::shared_ptr<const Terrain>& poTerrain) {
    auto input = std::make_shared<Input>();
    Fill(*poTerrain, *input);
    return input;
}
template <>
std::shared_ptr<const Index<EmbreeHits>::Input>
Index<EmbreeHits>::Prepare(const std::shared_ptr<const Terrain>& poTerrain) {
    auto input = std::make_shared<Input>();
    Fill(*poTerrain, *input);
    return input;
}

template <>
Index<Embree>::Index(const Input& oInput) : mpoTree(new Tree(oInput, RTC_SCENE_FLAG_ROBUST)) {}
template <>
Index<EmbreeHits>::Index(const Input& oInput) : mpoTree(new Tree(oInput, WITH_FILTER)) {}

template <>
Index<Embree>::~Index() = default;
template <>
Index<EmbreeHits>::~Index() = default;

template <>
bool Index<Embree>::GetHeight(float x, float y, float& h) const {
    RTCRayHit ray = mpoTree->DropRay(x, y);
    const float t = FindFirst(*mpoTree, ray);
    if (t < 0.0F)
        return false;
    h = ray.ray.org_z - t;
    return true;
}

template <>
bool Index<EmbreeHits>::GetHeight(float x, float y, float& h) const {
    RTCRayHit ray = mpoTree->DropRay(x, y);
    const std::vector<float>& hits = FindAll(*mpoTree, ray);
    if (hits.empty())
        return false;
    h = ray.ray.org_z - *std::min_element(hits.begin(), hits.end());
    return true;
}

namespace {

constexpr std::size_t STREAM = 1024; ///< rays of a stream: they stay in cache

void AnswerByStream(const Scene& oScene, const point2_t<float>* poFirst, std::size_t nCount,
                    float* pfHeights) {
    static std::vector<RTCRayHit> rays(STREAM);
    for (std::size_t i = 0; i < nCount; ++i)
        rays[i] = oScene.DropRay(poFirst[i].x, poFirst[i].y);
    RTCIntersectContext context;
    rtcInitIntersectContext(&context);
    context.flags = RTC_INTERSECT_CONTEXT_FLAG_COHERENT;
    rtcIntersect1M(oScene.Get(), &context, rays.data(), static_cast<unsigned>(nCount),
                   sizeof(RTCRayHit));
    for (std::size_t i = 0; i < nCount; ++i)
        pfHeights[i] = rays[i].hit.geomID == RTC_INVALID_GEOMETRY_ID
                           ? NO_HEIGHT
                           : rays[i].ray.org_z - rays[i].ray.tfar;
}

/// @param intersect rtcIntersect8 or rtcIntersect16
template <typename RayHit, std::size_t SIZE, typename Intersect>
void AnswerByPacket(const Scene& oScene, const point2_t<float>* poFirst, std::size_t nCount,
                    float* pfHeights, Intersect intersect) {
    RayHit rays{};
    alignas(64) int valid[SIZE];
    for (std::size_t i = 0; i < SIZE; ++i) {
        const RTCRayHit ray =
            oScene.DropRay(poFirst[std::min(i, nCount - 1)].x, poFirst[std::min(i, nCount - 1)].y);
        valid[i] = i < nCount ? -1 : 0;
        rays.ray.org_x[i] = ray.ray.org_x;
        rays.ray.org_y[i] = ray.ray.org_y;
        rays.ray.org_z[i] = ray.ray.org_z;
        rays.ray.dir_z[i] = ray.ray.dir_z;
        rays.ray.tfar[i] = ray.ray.tfar;
        rays.ray.mask[i] = ray.ray.mask;
        rays.hit.geomID[i] = RTC_INVALID_GEOMETRY_ID;
    }
    RTCIntersectContext context;
    rtcInitIntersectContext(&context);
    context.flags = RTC_INTERSECT_CONTEXT_FLAG_COHERENT;
    intersect(valid, oScene.Get(), &context, &rays);
    for (std::size_t i = 0; i < nCount; ++i)
        pfHeights[i] = rays.hit.geomID[i] == RTC_INVALID_GEOMETRY_ID
                           ? NO_HEIGHT
                           : rays.ray.org_z[i] - rays.ray.tfar[i];
}

} // namespace

template <>
void Index<Embree>::GetHeights(Batching eBatching, const std::vector<point2_t<float>>& oPositions,
                               std::vector<float>& rHeights) const {
    const bool is16 =
        rtcGetDeviceProperty(GetDevice(), RTC_DEVICE_PROPERTY_NATIVE_RAY16_SUPPORTED) != 0;
    const std::size_t step = eBatching == Batching::Stream ? STREAM : is16 ? 16 : 8;
    for (std::size_t i = 0; i < oPositions.size(); i += step) {
        const std::size_t count = std::min(step, oPositions.size() - i);
        const point2_t<float>* first = &oPositions[i];
        if (eBatching == Batching::Stream)
            AnswerByStream(*mpoTree, first, count, &rHeights[i]);
        else if (is16)
            AnswerByPacket<RTCRayHit16, 16>(*mpoTree, first, count, &rHeights[i], rtcIntersect16);
        else
            AnswerByPacket<RTCRayHit8, 8>(*mpoTree, first, count, &rHeights[i], rtcIntersect8);
    }
}

// Along a segment the height is monotone: seen from the higher end the first hit is the highest.
template <>
bool Index<Embree>::GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b,
                                           float& h) const {
    const point3_t<float>& top = a.z >= b.z ? a : b;
    const point3_t<float>& end = a.z >= b.z ? b : a;
    const point3_t<float> direction{end.x - top.x, end.y - top.y, end.z - top.z};
    RTCRayHit ray = Scene::MakeRay(top, direction, 1.0F);
    const float t = FindFirst(*mpoTree, ray);
    if (t < 0.0F)
        return false;
    h = top.z + t * direction.z;
    return true;
}

template <>
bool Index<EmbreeHits>::GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b,
                                               float& h) const {
    const point3_t<float> direction{b.x - a.x, b.y - a.y, b.z - a.z};
    RTCRayHit ray = Scene::MakeRay(a, direction, 1.0F);
    const std::vector<float>& hits = FindAll(*mpoTree, ray);
    if (hits.empty())
        return false;
    h = a.z + direction.z * (direction.z > 0.0F ? *std::max_element(hits.begin(), hits.end())
                                                : *std::min_element(hits.begin(), hits.end()));
    return true;
}

namespace {

/// Keeps, of the hits of each ray, the one that is highest along its segment.
struct HighestHits {
    RTCIntersectContext oContext; ///< first, so that the filter finds the rest
    std::vector<float> oHits;     ///< parameter along the ray; negative for none
};

void KeepHighest(const RTCFilterFunctionNArguments* poArgs) {
    auto* kept = reinterpret_cast<HighestHits*>(poArgs->context);
    for (unsigned i = 0; i < poArgs->N; ++i) {
        if (poArgs->valid[i] == 0)
            continue;
        const unsigned id = RTCRayN_id(poArgs->ray, poArgs->N, i);
        const float t = RTCRayN_tfar(poArgs->ray, poArgs->N, i);
        float& best = kept->oHits[id];
        const bool isRising = RTCRayN_dir_z(poArgs->ray, poArgs->N, i) > 0.0F;
        if (best < 0.0F || (isRising ? t > best : t < best))
            best = t;
        poArgs->valid[i] = 0;
    }
}

template <unsigned Width, typename Packet>
void AskPackets(RTCScene poScene, HighestHits& rHits, std::vector<RTCRayHit>& rRays,
                void (*ask)(const int*, RTCScene, RTCIntersectContext*, Packet*)) {
    for (std::size_t first = 0; first < rRays.size(); first += Width) {
        Packet packet{};
        alignas(64) int valid[Width];
        for (unsigned i = 0; i < Width; ++i) {
            valid[i] = first + i < rRays.size() ? -1 : 0;
            const RTCRayHit& ray = rRays[std::min(first + i, rRays.size() - 1)];
            packet.ray.org_x[i] = ray.ray.org_x;
            packet.ray.org_y[i] = ray.ray.org_y;
            packet.ray.org_z[i] = ray.ray.org_z;
            packet.ray.dir_x[i] = ray.ray.dir_x;
            packet.ray.dir_y[i] = ray.ray.dir_y;
            packet.ray.dir_z[i] = ray.ray.dir_z;
            packet.ray.tfar[i] = ray.ray.tfar;
            packet.ray.mask[i] = ray.ray.mask;
            packet.ray.id[i] = ray.ray.id;
            packet.hit.geomID[i] = RTC_INVALID_GEOMETRY_ID;
        }
        ask(valid, poScene, &rHits.oContext, &packet);
    }
}

} // namespace

void AnswerSegments(const Index<EmbreeHits>& oIndex, Batching eBatching,
                    const point3_t<float>* poSegments, std::size_t nCount, float* pfHeights) {
    static std::vector<RTCRayHit> rays;
    rays.resize(nCount);
    for (std::size_t i = 0; i < nCount; ++i) {
        const point3_t<float>& a = poSegments[2 * i];
        const point3_t<float>& b = poSegments[2 * i + 1];
        rays[i] = Scene::MakeRay(a, {b.x - a.x, b.y - a.y, b.z - a.z}, 1.0F);
        rays[i].ray.id = static_cast<unsigned>(i);
    }
    static HighestHits hits;
    rtcInitIntersectContext(&hits.oContext);
    hits.oContext.filter = KeepHighest;
    hits.oHits.assign(nCount, -1.0F);
    const RTCScene scene = oIndex.GetTree().Get();
    switch (eBatching) {
    case Batching::Single:
        for (RTCRayHit& ray : rays)
            rtcIntersect1(scene, &hits.oContext, &ray);
        break;
    case Batching::Packet:
        AskPackets<8, RTCRayHit8>(scene, hits, rays, rtcIntersect8);
        break;
    case Batching::Stream:
        rtcIntersect1M(scene, &hits.oContext, rays.data(), static_cast<unsigned>(nCount),
                       sizeof(RTCRayHit));
        break;
    }
    for (std::size_t i = 0; i < nCount; ++i) {
        const float t = hits.oHits[i];
        const point3_t<float>& a = poSegments[2 * i];
        pfHeights[i] = t < 0.0F ? std::numeric_limits<float>::quiet_NaN()
                                : a.z + t * (poSegments[2 * i + 1].z - a.z);
    }
}

} // namespace kelm::bench
