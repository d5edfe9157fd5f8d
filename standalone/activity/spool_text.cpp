#include "standalone/activity/spool_text.h"

#include "base/json_text.h"
#include "standalone/activity/record_line.h"

#include <json/value.h>

#include <string>

namespace velt {
namespace {

std::string textOf(const Json::Value& object, const char* name) {
    const Json::Value& member = object[name];
    return member.isString() ? member.asString() : std::string();
}

std::optional<std::int64_t> numberOf(const Json::Value& object, const char* name) {
    const Json::Value& member = object[name];
    return member.isInt64() ? std::optional<std::int64_t>(member.asInt64()) : std::nullopt;
}

/// In microseconds; a clock counts nanoseconds.
constexpr std::int64_t longestTime = 9'000'000'000'000'000;

bool isTime(const std::optional<std::int64_t>& number) {
    return number && *number >= 0 && *number <= longestTime;
}

std::optional<std::uint64_t> countOf(const Json::Value& object, const char* name) {
    const auto number = numberOf(object, name);
    return number && *number >= 0 ? std::optional(static_cast<std::uint64_t>(*number)) : std::nullopt;
}

/// Names of members begin with `prefix`.
RecordedPlace placeOf(const Json::Value& object, const std::string& prefix) {
    return {textOf(object, (prefix + "path").c_str()), textOf(object, (prefix + "server").c_str()),
            textOf(object, (prefix + "share").c_str()), textOf(object, (prefix + "within").c_str())};
}

void readTexts(const Json::Value& object, OperationRecord& record) {
    record.reason = textOf(object, "reason");
    record.session = textOf(object, "session");
    record.user = textOf(object, "user");
    record.account = textOf(object, "account");
    record.address = textOf(object, "address");
    record.detail = textOf(object, "detail");
    record.place = placeOf(object, "");
    record.newPlace = placeOf(object, "new");
    record.escaped = numberOf(object, "escaped").value_or(0) != 0;
    record.cut = numberOf(object, "cut").value_or(0) != 0;
}

void readNumbers(const Json::Value& object, OperationRecord& record) {
    record.octets = countOf(object, "octets");
    record.octetsIn = countOf(object, "in");
    record.octetsOut = countOf(object, "out");
    record.leftOut = countOf(object, "leftout").value_or(0);
    if (const auto duration = numberOf(object, "duration"); isTime(duration)) {
        record.duration = std::chrono::microseconds(*duration);
    }
}

/// What is left at the end where the last line has not ended.
std::string_view lineAt(std::string_view text) {
    return text.substr(0, text.find('\n'));
}

/// One line may hold the beginnings of several, when a disk was full in between: only the last can be whole.
void takeLine(std::string_view line, SpoolText& all) {
    const auto begin = line.rfind(static_cast<char>(velt_record_separator));
    const auto record = begin == line.npos ? std::nullopt : parseRecord(line.substr(begin + 1));
    if (record) {
        all.records.push_back(*record);
    }
    // Zeros stand where room was given back.
    const auto before = begin == line.npos ? line : line.substr(0, begin);
    const bool isDamaged = before.find_first_not_of('\0') != before.npos || (begin != line.npos && !record);
    all.damaged += isDamaged ? 1 : 0;
}

} // namespace

std::optional<OperationRecord> parseRecord(std::string_view line) {
    const auto parsed = parseJson(line);
    if (!parsed || !parsed->isObject()) {
        return std::nullopt;
    }
    const auto operation = operationNamed(textOf(*parsed, "kind"));
    const auto result = operationResultNamed(textOf(*parsed, "result"));
    const auto protocol = protocolNamed(textOf(*parsed, "protocol"));
    const auto time = numberOf(*parsed, "time");
    const auto number = numberOf(*parsed, "number");
    if (!operation || !result || !protocol || !isTime(time) || !number) {
        return std::nullopt;
    }
    OperationRecord record;
    record.time = OperationRecord::TimePoint(std::chrono::microseconds(*time));
    record.operation = *operation;
    record.result = *result;
    record.protocol = *protocol;
    record.number = *number;
    readTexts(*parsed, record);
    readNumbers(*parsed, record);
    return record;
}

SpoolText parseSpool(std::string_view text) {
    SpoolText all;
    while (all.taken < text.size()) {
        const std::string_view line = lineAt(text.substr(all.taken));
        if (all.taken + line.size() == text.size()) {
            break;
        }
        takeLine(line, all);
        all.taken += line.size() + 1;
    }
    return all;
}

} // namespace velt
