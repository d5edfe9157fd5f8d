#include "tests/host/fake_access.h"

#include "tests/support/fake_platform/fake_platform.h"

#include <algorithm>
#include <array>
#include <mutex>

namespace {

/// Operations that store, start or stop something.
bool changesSomething(const std::string& operation) {
    constexpr std::array<const char*, 14> changing{
        "VELTFTPConfSet",         "VELTFTPTimeOutSet",      "VELTFTPUseUTF8Set",    "VELTFTPFIPSEnabledSet",
        "VELTFTPASCIIEnabledSet", "VELTFTPUmaskEnabledSet", "VELTFTPAddChrootUser", "VELTFTPDeleteChrootUser",
        "VELTFTPChrootRuleSave",  "VELTSFTPConfigSet",      "VLIBCINFOSetKeyValue", "VLIBServiceStart",
        "VLIBServiceStop",        "VLIBServicecfgRunKeySet"};
    return std::find(changing.begin(), changing.end(), operation) != changing.end();
}

/// Modules of the tests' own are called on several threads; those that call the fake platform are not.
std::mutex mutex;
thread_local std::size_t journalStart = 0;

void tellObserver(const std::string& operation) {
    FakeAccess& access = FakeAccess::instance();
    if (operation == "VELTLogSet1" && access.observer.logEntry) {
        velt::host::AdminLogEntry entry;
        entry.id = static_cast<std::int64_t>(access.log.size()) + 1;
        entry.actor = access.actor;
        entry.address = access.address;
        access.log.push_back(entry);
        access.observer.logEntry(entry);
    } else if (operation == "VLIBSyseventEmit" && access.observer.serviceAction) {
        access.observer.serviceAction("ftpd", "start");
    } else if (operation == "VLIBServiceStart" && access.observer.daemonStarted) {
        access.observer.daemonStarted("sftp");
    }
}

} // namespace

FakeAccess& FakeAccess::instance() {
    static FakeAccess access;
    return access;
}

namespace velt::host {

bool openPlatform(const std::filesystem::path&, std::string&) {
    return true;
}

bool startEnabledServices(std::string&) {
    FakeAccess& access = FakeAccess::instance();
    ++access.starts;
    if (access.startHelps) {
        access.down.clear();
    }
    return access.down.empty();
}

std::vector<ServiceDown> servicesDown() {
    return FakeAccess::instance().down;
}

std::map<std::string, std::uint64_t> daemonRestarts() {
    return FakeAccess::instance().restarts;
}

void observePlatform(PlatformObserver observer) {
    FakeAccess::instance().observer = std::move(observer);
}

void unobservePlatform() {
    FakeAccess::instance().observer = {};
}

void beginPlatformRequest(const std::string& actor, const std::string& address) {
    const std::lock_guard lock(mutex);
    FakeAccess::instance().actor = actor;
    FakeAccess::instance().address = address;
    journalStart = fake::Platform::instance().journal.size();
}

PlatformReport endPlatformRequest() {
    const std::lock_guard lock(mutex);
    FakeAccess& access = FakeAccess::instance();
    PlatformReport report;
    const auto& journal = fake::Platform::instance().journal;
    for (std::size_t i = journalStart; i < journal.size(); ++i) {
        const std::string operation = fake::Platform::operationOf(journal[i]);
        report.changed = report.changed || changesSomething(operation);
        report.stored =
            report.stored || (changesSomething(operation) && !operation.starts_with("VLIBService"));
        tellObserver(operation);
    }
    report.storeFailed = access.storeFailed;
    report.sentence = access.sentence;
    report.holder = access.holder;
    report.port = access.port;
    return report;
}

std::optional<std::vector<AdminLogEntry>> queryAdminLog(const AdminLogQuery& query, std::string& error) {
    FakeAccess& access = FakeAccess::instance();
    access.largestLimit = std::max(access.largestLimit, query.limit);
    if (!access.logError.empty()) {
        error = access.logError;
        return std::nullopt;
    }
    std::vector<AdminLogEntry> found;
    for (auto entry = access.log.rbegin(); entry != access.log.rend(); ++entry) {
        const bool wanted = (!query.sinceMilliseconds || entry->milliseconds >= *query.sinceMilliseconds) &&
                            (!query.event || entry->event == *query.event) &&
                            (!query.actor || entry->actor == *query.actor) &&
                            (!query.beforeId || entry->id < *query.beforeId);
        if (wanted && found.size() < static_cast<std::size_t>(query.limit)) {
            found.push_back(*entry);
        }
    }
    return found;
}

} // namespace velt::host
