// Takes over what sessions wrote down.
#ifndef VELT_STANDALONE_ACTIVITY_SPOOL_READER_H
#define VELT_STANDALONE_ACTIVITY_SPOOL_READER_H

#include "base/result.h"
#include "standalone/activity/operation_store.h"

#include <cstdint>
#include <filesystem>
#include <vector>

namespace velt {

/// The spools of a state root, in their folder: the one that sessions open, and former ones, which had grown
/// large and which those sessions still write that had opened them before. For one thread in one process.
class SpoolReader {
public:
    struct Sizes {
        std::int64_t part = 1 << 20;     ///< octets that are read at once
        std::int64_t largest = 64 << 20; ///< beyond which a spool that is read up to its end is exchanged
    };

    /// The store outlives it.
    SpoolReader(std::filesystem::path folder, OperationStore& store, Sizes sizes);
    SpoolReader(std::filesystem::path folder, OperationStore& store)
        : SpoolReader(std::move(folder), store, Sizes()) {}

    struct Taken {
        std::vector<OperationRecord> records; ///< those that were not known yet, oldest first
        bool more = false;                    ///< whether there is more to take at once
        std::uint64_t damaged = 0;            ///< lines that were no records
    };

    /// Stores what has been written since, at most one part of each spool, and gives its room back. What one
    /// call does not finish, for whatever reason, the next one does.
    Result<Taken> take();

private:
    struct Spool;
    Result<std::vector<std::filesystem::path>> spools() const;
    Result<> takeFrom(const std::filesystem::path& path, Taken& all);
    Result<> takePart(Spool& spool, Taken& all);
    static Result<> exchange(const Spool& spool);
    Result<> remove(const Spool& spool);

    std::filesystem::path folder_;
    OperationStore& store_;
    Sizes sizes_;
};

} // namespace velt

#endif
