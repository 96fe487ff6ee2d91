#pragma once

#include <map>
#include <string>
#include <vector>

namespace kelm::bench {

/// Figures by name.
using Figures = std::map<std::string, double>;

/// Runs a job in a process of its own, whose memory nothing else has grown.
/// @param oJob name and arguments @return what the job reported
/// @throw std::runtime_error if the job fails
Figures RunChild(const std::vector<std::string>& oJob);

/// Does a job in this process and prints its figures. @return exit status
int RunJob(const std::vector<std::string>& oJob);

// The jobs. Memory in bytes, times in seconds of processor time.

/// Builds a peer's index over a terrain: "peak" and "held" beyond what it is built over.
Figures MeasureBuild(const std::string& sPeer, const std::string& sTerrain);
/// Loads a file by the library ("ours") or by a bare OGR loop: "open", "load", "peak" beyond the
/// start of the process, "triangles", and the sum of the "corners"' ordinates.
Figures MeasureLoad(const std::string& sWho, const std::string& sFile);
/// Loads a hundredth of a file ("part") or all of it ("whole"): "load" and "triangles".
Figures MeasureWindow(const std::string& sWhat, const std::string& sFile);

double GetProcessorTime();
/// @return resident memory
double GetResident();
/// @return greatest resident memory since the last reset
double GetPeak();
void ResetPeak();

} // namespace kelm::bench
