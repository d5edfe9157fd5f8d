#include "host/base/host_log.h"

#include "host/base/clock.h"

#include <array>
#include <cstdio>
#include <utility>

namespace velt::host {

namespace {

std::string printable(std::string_view text) {
    std::string safe;
    safe.reserve(text.size());
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte >= 0x20 && byte != 0x7F) {
            safe += c;
        } else {
            std::array<char, 5> escaped{};
            std::snprintf(escaped.data(), escaped.size(), "\\x%02X", static_cast<unsigned>(byte));
            safe += escaped.data();
        }
    }
    return safe;
}

void writeToStandardError(const std::string& line) {
    const std::string whole = timestamp() + " " + line + "\n";
    std::fwrite(whole.data(), 1, whole.size(), stderr);
}

} // namespace

HostLog::HostLog() : HostLog(writeToStandardError) {}

HostLog::HostLog(Sink sink) : sink_(std::move(sink)) {}

void HostLog::write(std::string_view text) {
    const std::string line = printable(text);
    const std::lock_guard lock(mutex_);
    sink_(line);
}

void HostLog::write(std::string_view requestId, std::string_view text) {
    write("request=" + std::string(requestId) + " " + std::string(text));
}

} // namespace velt::host
