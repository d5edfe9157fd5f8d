// Log entries and events of something that may still be taken back.
#ifndef VELT_STANDALONE_JOURNAL_HELD_JOURNAL_H
#define VELT_STANDALONE_JOURNAL_HELD_JOURNAL_H

#include "base/result.h"
#include "standalone/journal/log_entry.h"
#include "standalone/journal/system_event.h"

#include <variant>
#include <vector>

namespace velt {

/// While it lives, what its thread writes into the administrator log, and what it announces, is kept in here:
/// nobody hears of it. One at a time on a thread, where it stays.
class HeldJournal {
public:
    using Item = std::variant<LogEntry, SystemEvent>;

    HeldJournal();
    /// Drops what is still held.
    ~HeldJournal();
    HeldJournal(const HeldJournal&) = delete;
    HeldJournal& operator=(const HeldJournal&) = delete;

    /// In the order in which they came.
    const std::vector<Item>& items() const { return items_; }

    /// Writes down and announces all of it, and holds no more. Goes on after a failure, which syslog gets,
    /// and returns the first.
    Result<> release();

private:
    friend bool holdBack(const Item& item);
    static HeldJournal*& ofThisThread();

    std::vector<Item> items_;
};

/// Keeps the item where this thread holds such things back. False: it is to be written.
bool holdBack(const HeldJournal::Item& item);

} // namespace velt

#endif
