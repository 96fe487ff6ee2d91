#pragma once

namespace kelm::tellus {

/// Tells how many warnings were left out since the last call, a line for each kind. The store calls
/// it when it has closed a file.
///
/// A kind is a place in the sources. The handler that GDAL sets by default falls silent for good
/// after a thousand messages, so a file of a million bad polygons would silence all files that
/// follow. Of a kind the first hundred warnings between two calls are given, and those behind them
/// whose number is a power of ten. If there were more, only the first one is given until the next
/// call. Safe to call from any thread.
void TellLeftOut() noexcept;

} // namespace kelm::tellus
