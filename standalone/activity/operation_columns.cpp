#include "standalone/activity/operation_columns.h"

#include <array>
#include <optional>
#include <string>

namespace velt {
namespace {

constexpr int firstText = 14; ///< parameter
constexpr int ahead = 2;      ///< columns of a row before the operation's own, parameters count from 1

template<class Record> auto textsOf(Record& record) {
    return std::array{&record.reason,
                      &record.user,
                      &record.account,
                      &record.address,
                      &record.detail,
                      &record.place.path,
                      &record.place.serverPath,
                      &record.place.share,
                      &record.place.sharePath,
                      &record.newPlace.path,
                      &record.newPlace.serverPath,
                      &record.newPlace.share,
                      &record.newPlace.sharePath};
}

using Number = std::optional<std::int64_t>;

Number signedOf(const std::optional<std::uint64_t>& count) {
    return count ? Number(static_cast<std::int64_t>(*count)) : std::nullopt;
}

Number durationOf(const OperationRecord& record) {
    return record.duration ? Number(record.duration->count()) : std::nullopt;
}

std::optional<std::uint64_t> countAt(Statement& row, int column) {
    return row.isNull(column) ? std::nullopt : std::optional(static_cast<std::uint64_t>(row.number(column)));
}

} // namespace

void bindOperation(Statement& statement, const OperationRecord& record, std::int64_t session) {
    const auto time = std::chrono::floor<std::chrono::microseconds>(record.time.time_since_epoch());
    const std::array<Number, firstText - 1> numbers{time.count(),
                                                    session,
                                                    record.number,
                                                    static_cast<std::int64_t>(record.operation),
                                                    static_cast<std::int64_t>(record.result),
                                                    static_cast<std::int64_t>(record.protocol),
                                                    signedOf(record.octets),
                                                    signedOf(record.octetsIn),
                                                    signedOf(record.octetsOut),
                                                    durationOf(record),
                                                    record.escaped ? Number(1) : std::nullopt,
                                                    record.leftOut > 0 ? signedOf(record.leftOut)
                                                                       : std::nullopt,
                                                    record.cut ? Number(1) : std::nullopt};
    int parameter = 1;
    for (const Number& number : numbers) {
        statement.bind(parameter++, number);
    }
    for (const std::string* const text : textsOf(record)) {
        // A text that is empty takes no room.
        statement.bind(parameter++, text->empty() ? std::nullopt : std::optional(*text));
    }
}

std::size_t textOctets(const OperationRecord& record) {
    std::size_t octets = 0;
    for (const std::string* const text : textsOf(record)) {
        octets += text->size();
    }
    return octets;
}

OperationRecord readOperation(Statement& row) {
    OperationRecord record;
    record.id = row.number(0);
    record.session = row.text(1);
    record.time = OperationRecord::TimePoint(std::chrono::microseconds(row.number(ahead)));
    record.number = row.number(ahead + 2);
    record.operation = static_cast<Operation>(row.number(ahead + 3));
    record.result = static_cast<OperationResult>(row.number(ahead + 4));
    record.protocol = static_cast<SessionProtocol>(row.number(ahead + 5));
    record.octets = countAt(row, ahead + 6);
    record.octetsIn = countAt(row, ahead + 7);
    record.octetsOut = countAt(row, ahead + 8);
    if (const auto duration = countAt(row, ahead + 9)) {
        record.duration = std::chrono::microseconds(*duration);
    }
    record.escaped = row.number(ahead + 10) != 0;
    record.leftOut = countAt(row, ahead + 11).value_or(0);
    record.cut = row.number(ahead + 12) != 0;
    int column = ahead + firstText - 1;
    for (std::string* const text : textsOf(record)) {
        *text = row.text(column++);
    }
    return record;
}

} // namespace velt
