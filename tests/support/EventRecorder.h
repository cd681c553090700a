#ifndef ZRM_TESTS_EVENT_RECORDER_H
#define ZRM_TESTS_EVENT_RECORDER_H

#include "logs/zrm_rmlogent_data.h"

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

using namespace zrm;

/// The receiver of the rows of all logs in the programs that are linked with zrm_record_events():
/// keeps a copy of every row that a log's thread hands over.
namespace EventRecorder {

void clear();
std::vector<zrm_rmlogent_data_t> rows();
/// Waits until at least so many rows have arrived and returns them; fewer after the time limit.
std::vector<zrm_rmlogent_data_t> waitForRows(std::size_t count, int seconds = 10);

/// Runs `action` for every row, on the thread that hands it over, with the number of rows so far;
/// clear() forgets it.
void onRow(std::function<void(std::size_t)> action);

/// Writes the columns of the thresholds of every row behind its copy, in place, as a situation
/// with thresholds does; clear() forgets it.
void writeThresholds();

} // namespace EventRecorder

/// A character column without its blank padding.
template <std::size_t width> std::string columnText(const char (&column)[width]) {
    const std::string_view text(column, width);
    const std::size_t last = text.find_last_not_of(' ');
    return std::string(text.substr(0, last == std::string_view::npos ? 0 : last + 1));
}

#endif
