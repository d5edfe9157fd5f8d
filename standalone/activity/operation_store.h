// Where what sessions did is kept: a database of its own, which one thread writes.
#ifndef VELT_STANDALONE_ACTIVITY_OPERATION_STORE_H
#define VELT_STANDALONE_ACTIVITY_OPERATION_STORE_H

#include "base/result.h"
#include "standalone/activity/operation_record.h"
#include "standalone/journal/sqlite_file.h"
#include "standalone/journal/statement.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <vector>

namespace velt {

/// How much is kept; 0: without a limit.
struct OperationLimits {
    std::chrono::days age{90};
    std::int64_t size = 1'000'000'000; ///< octets of the database with its log
};

/// Not thread-safe. Others may search meanwhile.
class OperationStore {
public:
    /// Opens the database, which is made when it is missing.
    static Result<std::unique_ptr<OperationStore>> open(const std::filesystem::path& path);

    /// How much of this spool has been taken over, in octets. A spool is known by the number of its inode.
    Result<std::int64_t> taken(std::int64_t spool);

    /// Stores the records, and that the spool is taken over up to this octet: both or nothing, and durable on
    /// return. Gives those that were not known yet, with their ids.
    Result<std::vector<OperationRecord>> take(std::int64_t spool, std::int64_t upTo,
                                              std::vector<OperationRecord> records);

    /// Forgets a spool that is about to be removed.
    Result<> forget(std::int64_t spool);

    /// Removes a part of what is beyond the limits: what is too old, and of what is too much the oldest of
    /// who loses records by operation_room.h. True when there may be more of it.
    Result<bool> trim(const OperationLimits& limits, std::chrono::system_clock::time_point now);

    /// Whether the database is beyond this size, or nearly; never with 0.
    Result<bool> isFull(std::int64_t size);

private:
    explicit OperationStore(std::filesystem::path path) : path_(std::move(path)) {}
    Error cannotBe(const char* what) const;
    Result<> makeTables();
    Result<> prepare();
    int insertAll(std::vector<OperationRecord>& records);
    int insert(OperationRecord& record, bool& isNew);
    int sessionOf(const OperationRecord& record, std::int64_t& session);
    Result<> rollBack(const char* what);
    std::int64_t logOctets() const;
    Result<std::int64_t> usedOctets();
    Result<int> removeOld(const OperationLimits& limits, std::chrono::system_clock::time_point now);
    Result<int> removeMost(const OperationLimits& limits, std::chrono::system_clock::time_point now);

    struct Statements;
    struct CloseStatements {
        void operator()(Statements* statements) const;
    };

    std::filesystem::path path_;
    DatabaseOwner database_;
    std::unique_ptr<Statements, CloseStatements> statements_; ///< end before their database
};

} // namespace velt

#endif
