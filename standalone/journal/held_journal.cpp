#include "standalone/journal/held_journal.h"

#include "standalone/journal/admin_log.h"
#include "standalone/journal/announce.h"

#include <syslog.h>

#include <utility>

namespace velt {

namespace {

Result<> write(const LogEntry& entry) {
    return writeLogEntry(entry);
}

Result<> write(const SystemEvent& event) {
    return announce(event);
}

} // namespace

HeldJournal*& HeldJournal::ofThisThread() {
    thread_local HeldJournal* held = nullptr;
    return held;
}

HeldJournal::HeldJournal() {
    ofThisThread() = this;
}

HeldJournal::~HeldJournal() {
    if (ofThisThread() == this) {
        ofThisThread() = nullptr;
    }
}

Result<> HeldJournal::release() {
    ofThisThread() = nullptr;
    Result<> outcome;
    for (const Item& item : std::exchange(items_, {})) {
        auto written = std::visit([](const auto& each) { return write(each); }, item);
        if (!written) {
            ::syslog(LOG_ERR, "%s", written.error().message.c_str());
            outcome = outcome ? std::move(written) : outcome;
        }
    }
    return outcome;
}

bool holdBack(const HeldJournal::Item& item) {
    HeldJournal* const held = HeldJournal::ofThisThread();
    if (held == nullptr) {
        return false;
    }
    held->items_.push_back(item);
    return true;
}

} // namespace velt
