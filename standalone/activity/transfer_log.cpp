#include "standalone/activity/transfer_log.h"

#include "base/file.h"
#include "base/printable.h"
#include "base/unique_fd.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <fcntl.h>
#include <syslog.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <ctime>
#include <string_view>

namespace velt {
namespace {

constexpr mode_t logMode = 0640;

bool isTransfer(const OperationRecord& record) {
    return record.operation == Operation::upload || record.operation == Operation::download;
}

std::string_view placeOf(const OperationRecord& record) {
    return record.place.serverPath.empty() ? record.place.path : record.place.serverPath;
}

/// One word of a line.
std::string word(std::string_view text) {
    std::string all(text.empty() ? "*" : text);
    std::ranges::replace_if(
        all, [](unsigned char c) { return c <= ' ' || c == 0x7f; }, '_');
    return all;
}

/// "Mon Nov 23 04:05:06 2026". This program never leaves the C locale.
std::string localTime(OperationRecord::TimePoint time) {
    const std::time_t seconds = std::chrono::system_clock::to_time_t(time);
    std::tm parts{};
    std::array<char, 32> text{};
    ::localtime_r(&seconds, &parts);
    return {text.data(), std::strftime(text.data(), text.size(), "%a %b %d %H:%M:%S %Y", &parts)};
}

Result<> append(const std::string& lines) {
    const auto path = statePath(paths::transferLog);
    const UniqueFd file(
        ::open(path.c_str(), O_WRONLY | O_APPEND | O_CREAT | O_NOFOLLOW | O_CLOEXEC, logMode));
    if (!file || !writeAll(file.get(), lines)) {
        return Error(ErrorNumber::store, "Cannot write " + path.string() + ": " + std::strerror(errno) + ".");
    }
    return {};
}

} // namespace

std::string xferlogLine(const OperationRecord& record) {
    const bool deleted = record.operation == Operation::remove;
    if ((!isTransfer(record) && !deleted) || record.result == OperationResult::refused) {
        return "";
    }
    const auto seconds =
        std::chrono::ceil<std::chrono::seconds>(record.duration.value_or(std::chrono::microseconds{0}));
    const char* const direction = deleted ? "d" : record.operation == Operation::upload ? "i" : "o";
    // Transfers are binary, nothing is compressed, and nobody is asked who he is by RFC 1413.
    return localTime(record.time) + " " + std::to_string(seconds.count()) + " " + word(record.address) + " " +
           std::to_string(record.octets.value_or(0)) + " " + word(placeOf(record)) + " b _ " + direction +
           (record.user == "anonymous" || record.user == "ftp" ? " a " : " r ") + word(record.user) + " " +
           std::string(protocolName(record.protocol)) + " 0 * " +
           (record.result == OperationResult::done ? "c" : "i") + "\n";
}

std::string operationSentence(const OperationRecord& record) {
    std::string text = record.user + " (" + record.address + ", " +
                       std::string(protocolName(record.protocol)) +
                       "): " + std::string(operationName(record.operation)) + " " +
                       std::string(operationResultName(record.result));
    if (const auto place = placeOf(record); !place.empty()) {
        text += " " + std::string(place);
    }
    if (!record.newPlace.path.empty()) {
        text +=
            " -> " + (record.newPlace.serverPath.empty() ? record.newPlace.path : record.newPlace.serverPath);
    }
    text += record.octets ? ", " + std::to_string(*record.octets) + " octets" : "";
    text += record.reason.empty() ? "" : ", " + record.reason;
    return printable(text);
}

Result<> writeTransferLog(const ActivitySettings& settings, std::span<const OperationRecord> records) {
    if (settings.syslog) {
        for (const OperationRecord& record : records) {
            ::syslog(LOG_FTP | LOG_INFO, "%s", operationSentence(record).c_str());
        }
    }
    std::string lines;
    if (settings.xferlog) {
        for (const OperationRecord& record : records) {
            lines += xferlogLine(record);
        }
    }
    return lines.empty() ? Result<>() : append(lines);
}

} // namespace velt
