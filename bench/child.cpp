#include "bench/child.h"

#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <exception>
#include <fstream>
#include <iostream>
#include <stdexcept>

#include <unistd.h>

namespace kelm::bench {

namespace {

/// A figure of the kernel's on this process, in bytes; proc(5) gives them in kB.
double ReadStatus(const std::string& sField) {
    std::ifstream status("/proc/self/status");
    std::string field;
    while (status >> field) {
        double kilobytes;
        if (field == sField && status >> kilobytes)
            return kilobytes * 1024.0;
        status.ignore(4096, '\n');
    }
    throw std::runtime_error("the kernel does not tell " + sField);
}

std::string GetOwnPath() {
    char path[4096];
    const ssize_t length = readlink("/proc/self/exe", path, sizeof path);
    if (length < 0)
        throw std::runtime_error("the path of this program is not known");
    return {path, static_cast<std::size_t>(length)};
}

} // namespace

Figures RunChild(const std::vector<std::string>& oJob) {
    std::string command = "'" + GetOwnPath() + "' --child";
    for (const std::string& word : oJob)
        command += " '" + word + "'";
    std::FILE* output = popen(command.c_str(), "r");
    if (output == nullptr)
        throw std::runtime_error("no process for " + command);
    Figures figures;
    char name[64];
    double value;
    while (std::fscanf(output, "%63s %lf", name, &value) == 2)
        figures[name] = value;
    if (pclose(output) != 0)
        throw std::runtime_error(command + " failed");
    return figures;
}

int RunJob(const std::vector<std::string>& oJob) {
    try {
        Figures figures;
        if (oJob.size() == 3 && oJob[0] == "build")
            figures = MeasureBuild(oJob[1], oJob[2]);
        else if (oJob.size() == 3 && oJob[0] == "load")
            figures = MeasureLoad(oJob[1], oJob[2]);
        else if (oJob.size() == 3 && oJob[0] == "window")
            figures = MeasureWindow(oJob[1], oJob[2]);
        else
            throw std::invalid_argument("no such job");
        for (const auto& [name, value] : figures)
            std::printf("%s %.17g\n", name.c_str(), value);
        return EXIT_SUCCESS;
    } catch (const std::exception& failure) {
        std::cerr << failure.what() << '\n';
        return EXIT_FAILURE;
    }
}

double GetProcessorTime() {
    timespec time{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) * 1e-9;
}

double GetResident() {
    return ReadStatus("VmRSS:");
}

double GetPeak() {
    return ReadStatus("VmHWM:");
}

void ResetPeak() {
    // 5 stands for the peak resident memory, proc(5).
    std::ofstream("/proc/self/clear_refs") << 5;
}

} // namespace kelm::bench
