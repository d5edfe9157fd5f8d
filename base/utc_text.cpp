#include "base/utc_text.h"

#include <array>
#include <cstdio>
#include <ctime>
#include <iomanip>
#include <sstream>

namespace velt {

std::string utcText(TimePoint time, const char* format) {
    const std::time_t seconds = std::chrono::floor<std::chrono::seconds>(time).time_since_epoch().count();
    std::tm parts{};
    gmtime_r(&seconds, &parts);
    std::ostringstream text;
    text << std::put_time(&parts, format);
    return text.str();
}

std::string timestamp(TimePoint time) {
    const auto fraction = time - std::chrono::floor<std::chrono::seconds>(time);
    std::array<char, 8> milliseconds{};
    std::snprintf(milliseconds.data(), milliseconds.size(), ".%03dZ",
                  static_cast<int>(std::chrono::floor<std::chrono::milliseconds>(fraction).count()));
    return utcText(time, "%Y-%m-%dT%H:%M:%S") + milliseconds.data();
}

} // namespace velt
