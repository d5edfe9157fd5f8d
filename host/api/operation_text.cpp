#include "host/api/operation_text.h"

#include "base/printable.h"
#include "base/utc_text.h"
#include "host/base/json.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace velt::host {

namespace {

/// Octets per second; nothing for what is no transfer, or took no time.
Json::Value rateOf(const OperationRecord& record) {
    const auto micros = record.duration ? record.duration->count() : 0;
    if (!record.octets || micros <= 0) {
        return {};
    }
    constexpr double perSecond = 1e6;
    return Json::UInt64(static_cast<double>(*record.octets) * perSecond / static_cast<double>(micros));
}

Json::Value numberIn(const std::optional<std::uint64_t>& number) {
    return number ? Json::Value(Json::UInt64{*number}) : Json::Value();
}

/// One fact of a record, by the name that it has in all forms. Null or "" is none.
struct Column {
    const char* name;
    Json::Value (*valueOf)(const OperationRecord& record);
};

using Record = OperationRecord;

constexpr std::array<Column, 27> columns{{
    {"time", [](const Record& record) { return Json::Value(timestamp(record.time)); }},
    {"operation",
     [](const Record& record) { return Json::Value(std::string(operationName(record.operation))); }},
    {"result",
     [](const Record& record) { return Json::Value(std::string(operationResultName(record.result))); }},
    {"reason", [](const Record& record) { return Json::Value(record.reason); }},
    {"protocol",
     [](const Record& record) { return Json::Value(std::string(protocolName(record.protocol))); }},
    {"user", [](const Record& record) { return Json::Value(record.user); }},
    {"account", [](const Record& record) { return Json::Value(record.account); }},
    {"address", [](const Record& record) { return Json::Value(record.address); }},
    {"session", [](const Record& record) { return Json::Value(record.session); }},
    {"number", [](const Record& record) { return Json::Value(Json::Int64{record.number}); }},
    {"path", [](const Record& record) { return Json::Value(record.place.path); }},
    {"server_path", [](const Record& record) { return Json::Value(record.place.serverPath); }},
    {"share", [](const Record& record) { return Json::Value(record.place.share); }},
    {"share_path", [](const Record& record) { return Json::Value(record.place.sharePath); }},
    {"new_path", [](const Record& record) { return Json::Value(record.newPlace.path); }},
    {"new_server_path", [](const Record& record) { return Json::Value(record.newPlace.serverPath); }},
    {"new_share", [](const Record& record) { return Json::Value(record.newPlace.share); }},
    {"new_share_path", [](const Record& record) { return Json::Value(record.newPlace.sharePath); }},
    {"detail", [](const Record& record) { return Json::Value(record.detail); }},
    {"octets", [](const Record& record) { return numberIn(record.octets); }},
    {"octets_in", [](const Record& record) { return numberIn(record.octetsIn); }},
    {"octets_out", [](const Record& record) { return numberIn(record.octetsOut); }},
    {"duration_us",
     [](const Record& record) {
         return record.duration ? Json::Value(Json::Int64{record.duration->count()}) : Json::Value();
     }},
    {"rate", rateOf},
    {"left_out",
     [](const Record& record) {
         return record.leftOut > 0 ? Json::Value(Json::UInt64{record.leftOut}) : Json::Value();
     }},
    {"cut", [](const Record& record) { return record.cut ? Json::Value(true) : Json::Value(); }},
    {"escaped", [](const Record& record) { return record.escaped ? Json::Value(true) : Json::Value(); }},
}};

bool isNone(const Json::Value& value) {
    return value.isNull() || (value.isString() && value.asString().empty());
}

/// The characters with which a formula begins, also those of double width.
bool beginsFormula(std::string_view rest) {
    constexpr std::array<std::string_view, 8> signs{"=",      "+",      "-",      "@",
                                                    "\uFF1D", "\uFF0B", "\uFF0D", "\uFF20"};
    return std::ranges::any_of(signs, [&](std::string_view sign) { return rest.starts_with(sign); });
}

/// Not only at its start: where the semicolon separates cells, a spreadsheet splits the line at those within
/// a cell, too, whatever is quoted.
std::string withoutFormulas(std::string_view cell) {
    std::string safe;
    bool atStart = true;
    for (std::size_t i = 0; i < cell.size(); ++i) {
        if (atStart && (beginsFormula(cell.substr(i)) || (i == 0 && cell[i] == '\''))) {
            safe += '\'';
        }
        safe += cell[i];
        atStart = cell[i] == ';' || (atStart && (cell[i] == ' ' || cell[i] == '"'));
    }
    return safe;
}

std::string csvCell(const Json::Value& value) {
    if (!value.isString()) {
        return value.isNull() ? "" : value.asString();
    }
    std::string text = withoutFormulas(printable(value.asString()));
    if (text.find_first_of(",;\"") == std::string::npos) {
        return text;
    }
    std::string quoted = "\"";
    for (const char c : text) {
        quoted += c == '"' ? "\"\"" : std::string(1, c);
    }
    return quoted + '"';
}

} // namespace

Json::Value toObject(const OperationRecord& record) {
    Json::Value object(Json::objectValue);
    for (const auto& [name, valueOf] : columns) {
        if (Json::Value value = valueOf(record); !isNone(value)) {
            object[name] = std::move(value);
        }
    }
    return object;
}

std::string toJsonLines(const std::vector<OperationRecord>& records) {
    std::string text;
    for (const OperationRecord& record : records) {
        text += toJson(toObject(record)) + '\n';
    }
    return text;
}

std::string toCsv(const std::vector<OperationRecord>& records) {
    constexpr const char* lineEnd = "\r\n";
    std::string text;
    for (const auto& [name, valueOf] : columns) {
        text += (text.empty() ? "" : ",") + std::string(name);
    }
    text += lineEnd;
    for (const OperationRecord& record : records) {
        const char* separator = "";
        for (const auto& [name, valueOf] : columns) {
            text += separator + csvCell(valueOf(record));
            separator = ",";
        }
        text += lineEnd;
    }
    return text;
}

} // namespace velt::host
