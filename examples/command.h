#pragma once

#include <CLI/CLI.hpp>

#include <cstdio>
#include <exception>
#include <functional>
#include <stdexcept>

/// Prints a failure and the one that it came from, if there is such: why a file cannot be opened.
inline void PrintFailure(const char* program, const std::exception& failure) {
    std::fprintf(stderr, "%s: %s\n", program, failure.what());
    try {
        std::rethrow_if_nested(failure);
    } catch (const std::exception& reason) {
        PrintFailure(program, reason);
    } catch (...) {
        std::fprintf(stderr, "%s: the reason is not told\n", program);
    }
}

/// Reads the command line into the options of the app and runs the command. The command may throw a
/// CLI::ValidationError if it finds the command line wrong.
/// @return the exit status: 0 for success, 1 for a failure, 2 for a wrong command line. Failures
/// are told on standard error
inline int RunCommand(CLI::App& app, int argc, char** argv, const std::function<void()>& command) {
    try {
        app.parse(argc, argv);
        command();
        if (std::fflush(stdout) != 0 || std::ferror(stdout) != 0)
            throw std::runtime_error("cannot write to standard output");
    } catch (const CLI::ParseError& failure) {
        return app.exit(failure) == 0 ? 0 : 2;
    } catch (const std::exception& failure) {
        PrintFailure(app.get_name().c_str(), failure);
        return 1;
    }
    return 0;
}
