#pragma once

#include <CLI/CLI.hpp>

#include <cstdio>
#include <functional>
#include <stdexcept>

/// Reads the command line into the options of the app and runs the command. @return its exit
/// status: 0; 1 for a failure, told on standard error; 2 for a command line that has no meaning,
/// which the command may also find itself and tell by throwing a CLI::ValidationError
inline int RunCommand(CLI::App& app, int argc, char** argv, const std::function<void()>& command) {
    try {
        app.parse(argc, argv);
        command();
        if (std::fflush(stdout) != 0 || std::ferror(stdout) != 0)
            throw std::runtime_error("cannot write to standard output");
    } catch (const CLI::ParseError& failure) {
        return app.exit(failure) == 0 ? 0 : 2;
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s: %s\n", app.get_name().c_str(), failure.what());
        return 1;
    }
    return 0;
}
