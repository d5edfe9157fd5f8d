#include "host/base/host_log.h"

#include "base/printable.h"
#include "base/utc_text.h"

#include <cstdio>
#include <utility>

namespace velt::host {

namespace {

void writeToStandardError(const std::string& line) {
    const std::string whole = timestamp() + " " + line + "\n";
    std::fwrite(whole.data(), 1, whole.size(), stderr);
}

constexpr unsigned refusalsPerSecond = 10;

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

std::optional<std::size_t> HostLog::admitRefusal() {
    const auto now = std::chrono::steady_clock::now();
    const std::lock_guard lock(mutex_);
    if (now - second_ >= std::chrono::seconds(1)) {
        second_ = now;
        refusals_ = 0;
    }
    if (refusals_ == refusalsPerSecond) {
        ++leftOut_;
        return std::nullopt;
    }
    ++refusals_;
    return std::exchange(leftOut_, 0);
}

void HostLog::writeRefusal(std::string_view requestId, std::string_view text) {
    const auto leftOut = admitRefusal();
    if (!leftOut) {
        return;
    }
    if (*leftOut > 0) {
        write(std::to_string(*leftOut) + " refusals before the next line are not logged");
    }
    write(requestId, text);
}

} // namespace velt::host
