#pragma once

#include <tin/progress.h>

#include <pybind11/pybind11.h>

namespace kelm::python {

/// Calls a Python function with the share of a part of the work, and lets Ctrl-C stop the work.
class PythonProgress {
  public:
    /// @param callable None: only Ctrl-C is looked for @param from,to share of the whole work that
    /// is done at the start and at the end of the part
    PythonProgress(const pybind11::object& callable, double from, double to)
        : moCallable(callable), mdfFrom(from), mdfTo(to) {}

    /// @return the progress of the part, which this object must outlive. It takes the interpreter's
    /// lock, and throws what the function raises
    tin::Progress Get() { return {&PythonProgress::Tell, this}; }

  private:
    static int Tell(double done, const char* /*message*/, void* data) {
        constexpr int TOTAL = 100;
        const auto& self = *static_cast<PythonProgress*>(data);
        const pybind11::gil_scoped_acquire lock;
        if (PyErr_CheckSignals() != 0)
            throw pybind11::error_already_set();
        if (!self.moCallable.is_none())
            self.moCallable(
                static_cast<int>(TOTAL * (self.mdfFrom + done * (self.mdfTo - self.mdfFrom))),
                TOTAL);
        return 1;
    }

    const pybind11::object& moCallable;
    double mdfFrom;
    double mdfTo;
};

} // namespace kelm::python
