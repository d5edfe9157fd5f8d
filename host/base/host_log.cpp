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

void HostLog::writeRefusal(std::string_view requestId, std::string_view text) {
    std::unique_lock lock(mutex_);
    const auto leftOut = refusals_.admit();
    lock.unlock();
    if (!leftOut) {
        return;
    }
    if (*leftOut > 0) {
        write(std::to_string(*leftOut) + " refusals before the next line are not logged");
    }
    write(requestId, text);
}

} // namespace velt::host
