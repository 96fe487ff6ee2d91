#include "bench/child.h"
#include "bench/suite.h"

#include <gdal.h>

#include <algorithm>
#include <cstring>

// Usage: tin_bench [--quick] [--data=FOLDER] [options of Google Benchmark]

namespace {

using kelm::bench::Plan;

/// Takes an option of our own off the command line. @return its value, or null if it is not there
const char* TakeOption(int& argc, char** argv, const char* pszName) {
    for (int i = 1; i < argc; ++i)
        if (std::strncmp(argv[i], pszName, std::strlen(pszName)) == 0) {
            const char* value = argv[i] + std::strlen(pszName);
            std::copy(argv + i + 1, argv + argc + 1, argv + i);
            --argc;
            return value;
        }
    return nullptr;
}

/// What was measured, for the report.
void AddVersions() {
    benchmark::AddCustomContext("compiler", __VERSION__);
    benchmark::AddCustomContext("GDAL", GDALVersionInfo("RELEASE_NAME"));
#ifdef KELM_BENCH_CGAL
    benchmark::AddCustomContext("CGAL", KELM_BENCH_CGAL);
#endif
#ifdef KELM_BENCH_EMBREE
    benchmark::AddCustomContext("Embree", KELM_BENCH_EMBREE);
#endif
#ifdef KELM_BENCH_BOOST
    benchmark::AddCustomContext("Boost", KELM_BENCH_BOOST);
#endif
#ifdef KELM_BENCH_GEOS
    benchmark::AddCustomContext("GEOS", KELM_BENCH_GEOS);
#endif
#ifdef KELM_BENCH_MESHOPTIMIZER
    benchmark::AddCustomContext("meshoptimizer", KELM_BENCH_MESHOPTIMIZER);
#endif
}

} // namespace

int main(int argc, char** argv) {
    GDALAllRegister();
    if (argc > 1 && std::strcmp(argv[1], "--child") == 0)
        return kelm::bench::RunJob({argv + 2, argv + argc});
    Plan plan;
    plan.bQuick = TakeOption(argc, argv, "--quick") != nullptr;
    if (const char* folder = TakeOption(argc, argv, "--data="))
        plan.sDataFolder = folder;
    for (const auto add :
         {kelm::bench::AddBuild, kelm::bench::AddCrossing, kelm::bench::AddDegenerate,
          kelm::bench::AddHeight, kelm::bench::AddHeightGrid, kelm::bench::AddLine,
          kelm::bench::AddScan, kelm::bench::AddRaster, kelm::bench::AddWeld, kelm::bench::AddRing,
          kelm::bench::AddLoad, kelm::bench::AddWindow})
        add(plan);
    AddVersions();
    benchmark::AddCustomContext("plan", plan.bQuick ? "quick" : "full");
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv))
        return 1;
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
