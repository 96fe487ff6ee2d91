#pragma once

#include <pybind11/numpy.h>
#include <pybind11/pybind11.h>

#include <array>
#include <cstdint>

namespace kelm::python {

namespace py = pybind11;

/// A contiguous array of the caller's or of Python's own. The package converts before it calls.
template <typename T>
using Array = py::array_t<T, py::array::c_style>;

/// @return a new array of one axis, not initialised
inline Array<float> MakeFloats(py::ssize_t count) {
    return Array<float>(std::vector<py::ssize_t>{count});
}

/// @return a read-only array of rows of three over memory of `owner`, which it keeps alive
template <typename T>
py::array MakeView(const T* data, std::size_t rows, const py::object& owner) {
    py::array view(py::dtype::of<T>(),
                   {static_cast<py::ssize_t>(rows), static_cast<py::ssize_t>(3)}, data, owner);
    view.attr("flags").attr("writeable") = false;
    return view;
}

} // namespace kelm::python
