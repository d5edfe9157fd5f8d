#include "tests/standalone/crash/stores.h"

#include "base/file.h"
#include "ftp/ftp_library.h"
#include "platform/adminlog.h"
#include "platform/service.h"
#include "platform/sftp.h"
#include "platform/sysevent.h"
#include "standalone/contract/boundary.h"
#include "standalone/contract/last_error.h"
#include "standalone/contract/string_map.h"
#include "standalone/control/start_failure.h"
#include "standalone/core/state_lock.h"
#include "standalone/journal/event_file.h"
#include "standalone/keys/key_store.h"
#include "standalone/settings/settings.h"
#include "standalone/standalone.h"
#include "tests/standalone/crash/killed_process.h"
#include "tests/standalone/support/example_keys.h"

#include <cstring>
#include <map>
#include <vector>

namespace velt::test {

std::string unreadable() {
    return "unreadable: " + lastErrorSentence();
}

std::string readRecord() {
    _tag_VELT_FTP_CONF_ record{};
    return VELTFTPConfGet(&record) < 0 ? unreadable()
                                       : std::string(reinterpret_cast<const char*>(&record), sizeof(record));
}

std::string readSftp() {
    _tag_VELT_SFTP_CONFIG_ record{};
    return VELTSFTPConfigGet(1, &record) < 0
               ? unreadable()
               : std::to_string(record.enable) + " " + std::to_string(record.port);
}

namespace {

std::string fileText(const char* path) {
    return readFile(statePath(path)).valueOr("no file");
}

int storeRecord(const char* port, int limit) {
    _tag_VELT_FTP_CONF_ record = defaultFtpSettings().record;
    std::strcpy(record.portnum, port);
    std::memset(record.anonymous_chroot_share, limit == 1 ? 'a' : 'b', 400);
    record.max_conn_per_ip = limit;
    return VELTFTPConfSet(record);
}

template<int (*get)()> std::string readNumber() {
    const int value = get();
    return value < 0 ? unreadable() : std::to_string(value);
}

std::string readSystemInformation() {
    return loadFtpSettings() ? fileText("/etc/veltinfo.conf") : unreadable();
}

class List {
public:
    explicit List(const std::vector<const char*>& texts = {}) {
        for (const char* text : texts) {
            VLIBCSzListPush(&list_, text);
        }
    }
    ~List() { VLIBCSzListFree(list_); }
    List(const List&) = delete;
    List& operator=(const List&) = delete;
    VLIBCSzList*& get() { return list_; }

private:
    VLIBCSzList* list_ = VLIBCSzListAlloc(8);
};

int storeRules(const std::vector<const char*>& lines) {
    return VELTFTPChrootRuleSave(List(lines).get());
}

std::string readRules() {
    List rules;
    if (VELTFTPChrootRuleEnum(&rules.get()) < 0) {
        return unreadable();
    }
    std::string text;
    for (int i = 0; i < rules.get()->count; ++i) {
        text += std::string(VLIBCSzListGet(rules.get(), i)) + "\n";
    }
    return text;
}

int logText(const char* text) {
    return VELTLogSet1(1, 1, 0x11B00024, text, "", "", "");
}

/// Without the entries that earlier rounds have left.
int logAnew() {
    for (const char* file : {"log.db", "log.db-wal", "log.db-shm"}) {
        std::filesystem::remove(statePath("/var/lib/velt") / file);
    }
    return logText("old");
}

std::string readLog() {
    const auto entries = queryLog(LogFilter{});
    if (!entries) {
        return "unreadable: " + entries.error().message;
    }
    std::string text;
    for (const LogEntry& entry : *entries) {
        text += entry.texts[0] + " ";
    }
    return text;
}

int emit(const char* name) {
    VLIBCSzHash parameters;
    parameters.entries["filler"] = std::string(5000, 'x');
    return VLIBSyseventEmit(name, &parameters, 1);
}

int emitAnew() {
    std::filesystem::remove_all(statePath("/var/log/velt"));
    return emit("old");
}

/// So that the next event does not fit.
int fillEvents() {
    const int result = emitAnew();
    const std::string line = fileText("/var/log/velt/events.jsonl");
    std::string full;
    while (full.size() + line.size() <= largestEventFile) {
        full += line;
    }
    return result < 0 || replaceFile(statePath("/var/log/velt/events.jsonl"), full, 0640) ? result : -1;
}

int storeKeys(const std::vector<std::string>& keys) {
    KeyFile file{"ann", 1000, {}};
    for (const std::string& key : keys) {
        file.keys.push_back({keyOf(key), "then", "root"});
    }
    const auto lock = StateLock::take();
    return toContract(lock ? storeKeyFile(file) : Result<>(lock.error()));
}

std::string readKeys() {
    const auto file = loadKeyFile("ann");
    if (!file) {
        return "unreadable: " + file.error().message;
    }
    return *file ? keysForDaemon(**file, 1000) : "no file";
}

/// How often each event stands there, in whole lines.
std::string readEvents() {
    std::string all;
    for (const char* file : {"/var/log/velt/events.jsonl.1", "/var/log/velt/events.jsonl"}) {
        all += readFile(statePath(file)).valueOr("");
    }
    std::map<std::string, int> counts;
    for (std::size_t at = 0; at < all.size();) {
        const std::size_t end = all.find('\n', at);
        const std::string line = all.substr(at, end - at);
        const bool whole = end != std::string::npos && line.front() == '{' && line.back() == '}';
        ++counts[!whole ? "half" : line.find("\"new\"") != std::string::npos ? "new" : "old"];
        at = whole ? end + 1 : all.size();
    }
    return "old " + std::to_string(counts["old"]) + " new " + std::to_string(counts["new"]) + " half " +
           std::to_string(counts["half"]);
}

const Store table[] = {
    {"TheFtpRecord", [] { return storeRecord("21", 1); }, [] { return storeRecord("2121", 2); }, readRecord},
    {"TheTimeOut", [] { return VELTFTPTimeOutSet(1); }, [] { return VELTFTPTimeOutSet(2); },
     readNumber<VELTFTPTimeOutGet>},
    {"Fips", [] { return VELTFTPFIPSEnabledSet(0); }, [] { return VELTFTPFIPSEnabledSet(1); },
     readNumber<VELTFTPFIPSEnabledGet>},
    {"TheUmask", [] { return VELTFTPUmaskEnabledSet(false); }, [] { return VELTFTPUmaskEnabledSet(true); },
     readNumber<VELTFTPUmaskEnabledGet>},
    {"TheExternalAddress", [] { return VLIBCINFOSetKeyValue("ftp_ext_ip", "192.0.2.1"); },
     [] { return VLIBCINFOSetKeyValue("ftp_ext_ip", "198.51.100.200"); }, readSystemInformation},
    {"AnotherKeyOfTheSystem", [] { return VLIBCINFOSetKeyValue("a_key", "old"); },
     [] { return VLIBCINFOSetKeyValue("a_key", "a new one"); }, readSystemInformation},
    {"Sftp", [] { return VELTSFTPConfigSet(0, 22); }, [] { return VELTSFTPConfigSet(0, 2222); }, readSftp},
    {"ChrootRules", [] { return storeRules({"u:1000:/home"}); },
     [] {
         return storeRules({"g:100:/public/below", "u:1001:/public"});
     },
     readRules},
    {"AnAddedChrootUser", [] { return storeRules({"u:1001:/public"}); },
     [] {
         return VELTFTPAddChrootUser(List({"ann", "ben"}).get());
     },
     readRules},
    {"ADeletedChrootUser",
     [] {
         return storeRules({"u:1000:/home", "u:1001:/public"});
     },
     [] { return VELTFTPDeleteChrootUser(List({"ann"}).get()); }, readRules},
    {"KeysOfAUser", [] { return storeKeys({aKey}); },
     [] {
         return storeKeys({anotherKey, aKey});
     },
     readKeys},
    {"ARunKey", [] { return VLIBServicecfgRunKeySet("ftpd", 1); },
     [] { return VLIBServicecfgRunKeySet("ftpd", 2); }, [] { return fileText("/etc/velt/run-keys/ftpd"); }},
    {"TheLog", logAnew, [] { return logText("new"); }, readLog},
    {"TheFailureOfAStart", [] { return toContract(noteOutcome(ftpDaemon, {})); },
     [] {
         const Error failure(ErrorNumber::daemon, "It does not start.");
         return noteOutcome(ftpDaemon, failure) ? -1 : 0;
     },
     [] { return fileText("/run/velt/ftpd.failure"); }, true},
    {"AnEvent", emitAnew, [] { return emit("new"); }, readEvents},
    {"AnEventThatNeedsANewFile", fillEvents, [] { return emit("new"); }, readEvents},
};

} // namespace

std::span<const Store> stores() {
    return table;
}

void PrintTo(const Store& store, std::ostream* out) {
    *out << store.name;
}

void StoreTestBase::SetUp() {
    AccountSources sources;
    sources.passwd = root_.write("accounts/passwd", "ann:x:1000:100::/home/ann:/bin/sh\n"
                                                    "ben:x:1001:100::/home/ben:/bin/sh\n");
    sources.group = root_.write("accounts/group", "users:x:100:\n");
    sources.loginDefs = root_.write("accounts/login.defs", "UID_MIN 1000\nUID_MAX 200000\n");
    sources.nsswitch = root_.write("accounts/nsswitch.conf", "passwd: files\ngroup: files\n");
    sources.moduleFolder = root_.path();
    setAccountSources(sources);
    root_.write("/etc/veltinfo.conf", "# somebody else's\nother=1\n");
}

std::string StoreTest::read() {
    return tellInChild(GetParam().read);
}

void StoreTest::storeOld() {
    ASSERT_EQ(tellInChild([] { return GetParam().storeOld() < 0 ? unreadable() : "stored"; }), "stored");
}

} // namespace velt::test
