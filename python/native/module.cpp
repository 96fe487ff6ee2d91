#include "python/native/messages.h"
#include "python/native/progress.h"
#include "python/native/reading.h"
#include "python/native/surface.h"

#include <services/exception.h>

#include <pybind11/stl.h>

#include <utility>

namespace kelm::python {

namespace {

using ogc::cs::DatumType;

/// Runs without the interpreter's lock. Warnings are appended to the caller's list, also if the
/// work fails.
template <typename Work>
auto Collect(py::list& texts, const Work& work) {
    Messages messages;
    struct Appender {
        Messages& moMessages;
        py::list& moTexts;
        ~Appender() {
            for (const std::string& text : moMessages.Take())
                moTexts.append(py::str(py::bytes(text).attr("decode")("utf-8", "replace")));
        }
    } const appender{messages, texts};
    const py::gil_scoped_release release;
    return work();
}

auto ReadFile(const std::string& file, int layer, DatumType source, DatumType output,
              const std::optional<std::array<double, 4>>& window,
              const std::optional<std::array<double, 2>>& base, double offset, double scale,
              std::string survey, const py::object& progress, py::list warnings) {
    // Without a survey, opening reads the layer, which is most of the work.
    const double opened = survey.empty() ? 0.8 : 0.0;
    PythonProgress opening(progress, 0.0, opened);
    PythonProgress loading(progress, opened, 1.0);
    const ReadOptions options{layer,        source, output, window,
                              base,         offset, scale,  {std::move(survey), opening.Get()},
                              loading.Get()};
    return Collect(warnings, [&] { return Read(file, options); });
}

auto SurveyFile(const std::string& file, int layer, const py::object& progress, py::list warnings) {
    PythonProgress opening(progress, 0.0, 1.0);
    ReadOptions options;
    options.mnLayer = layer;
    options.moOpening.progress = opening.Get();
    auto [facts, bytes] = Collect(warnings, [&] { return SurveyLayer(file, options); });
    return std::pair(std::move(facts), py::bytes(bytes));
}

auto CountFile(const std::string& file, int layer, std::string survey,
               const std::vector<std::array<double, 4>>& windows, py::list warnings) {
    ReadOptions options;
    options.mnLayer = layer;
    options.moOpening.survey = std::move(survey);
    return Collect(warnings, [&] { return CountShapes(file, options, windows); });
}

auto ListFile(const std::string& file, py::list warnings) {
    return Collect(warnings, [&] { return ListLayers(file); });
}

/// Errors of files become OSError. All others of the libraries become DataError, a ValueError.
void AddErrors(py::module_& module) {
    static py::object& dataError =
        *new py::object(py::exception<kelm::Exception>(module, "DataError", PyExc_ValueError));
    dataError.attr("__doc__") =
        "Data, or an argument, that cannot be used: a layer, a shape, a datum.";
    dataError.attr("__module__") = "kelm_tin";
    py::register_exception_translator([](std::exception_ptr failure) {
        try {
            std::rethrow_exception(std::move(failure));
        } catch (const FileError& error) {
            PyErr_SetString(PyExc_OSError, error.what());
        } catch (const kelm::Exception& error) {
            PyErr_SetString(dataError.ptr(), GetText(error).c_str());
        }
    });
}

void AddSurface(py::module_& module) {
    py::class_<Surface>(module, "Surface")
        .def(py::init(&Surface::FromArrays))
        .def_property_readonly("points",
                               [](const py::object& self) { return Surface::GetPoints(self); })
        .def_property_readonly("triangles",
                               [](const py::object& self) { return Surface::GetTriangles(self); })
        .def_property_readonly("base", &Surface::GetBase)
        .def_property_readonly("box", &Surface::GetBox)
        .def_property_readonly("nbytes", &Surface::GetBytes)
        .def("height", &Surface::GetHeight)
        .def("heights", &Surface::GetHeights)
        .def("crossings", &Surface::GetCrossings)
        .def("rasterize", &Surface::Rasterize)
        .def("subset", &Surface::Subset)
        .def("along", &Surface::SubsetAlong);
}

void AddFiles(py::module_& module) {
    py::enum_<DatumType>(module, "Datum")
        .value("other", ogc::cs::VD_Other)
        .value("orthometric", ogc::cs::VD_Orthometric)
        .value("ellipsoidal", ogc::cs::VD_Ellipsoidal);
    py::class_<LayerFacts>(module, "LayerFacts")
        .def_readonly("number", &LayerFacts::mnNumber)
        .def_readonly("refusal", &LayerFacts::moRefusal)
        .def_readonly("shapes", &LayerFacts::mnShapes)
        .def_readonly("box", &LayerFacts::moBox)
        .def_readonly("crs", &LayerFacts::moCrs)
        .def_readonly("load_nbytes", &LayerFacts::mnLoadBytes)
        .def_readonly("surface_nbytes", &LayerFacts::mnSurfaceBytes);
    module.def("read", &ReadFile);
    module.def("survey", &SurveyFile);
    module.def("count", &CountFile);
    module.def("flatten_crs", &FlattenCrs);
    module.def("layers", &ListFile);
}

} // namespace

// NOLINTNEXTLINE: the macro is pybind11's
PYBIND11_MODULE(_native, module) {
    module.doc() = "What the package is made of. Not for direct use: it tests no shapes.";
    module.attr("__version__") = KELM_TIN_VERSION;
    AddErrors(module);
    AddSurface(module);
    AddFiles(module);
}

} // namespace kelm::python
