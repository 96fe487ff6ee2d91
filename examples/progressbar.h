#pragma once

#include <tin/progress.h>

#include <unistd.h>

#include <chrono>
#include <cstdio>

/// Shows on a terminal how far the reading of a file is, once it has taken a second. Draws on
/// standard error, and nothing if that is no terminal.
class ProgressBar {
  public:
    ProgressBar() = default;
    ProgressBar(const ProgressBar&) = delete;
    ProgressBar& operator=(const ProgressBar&) = delete;
    ~ProgressBar() { std::fputs(mbDrawn ? "\n" : "", stderr); }

    /// @return the progress of an operation, which the bar must outlive
    kelm::tin::Progress Get() { return {&ProgressBar::Tell, this}; }

  private:
    static int Tell(double done, const char* message, void* data) {
        auto& self = *static_cast<ProgressBar*>(data);
        if (isatty(STDERR_FILENO) != 0 && Clock::now() - self.moStart > std::chrono::seconds(1))
            self.Draw(done, message);
        return 1;
    }

    void Draw(double done, const char* message) {
        constexpr int WIDTH = 40;
        constexpr char FULL[] = "########################################";
        mbDrawn = true;
        std::fprintf(stderr, "\r[%-*.*s] %3.0f %% %-20s", WIDTH, static_cast<int>(done * WIDTH),
                     FULL, 100.0 * done, message);
    }

    using Clock = std::chrono::steady_clock;
    Clock::time_point moStart = Clock::now();
    bool mbDrawn = false;
};
