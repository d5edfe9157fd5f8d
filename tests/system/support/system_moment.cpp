#include "tests/system/support/system_moment.h"

#include "tests/host/client.h"
#include "tests/support/files.h"
#include "tests/support/run_program.h"
#include "tests/support/text.h"
#include "tests/system/support/host_service.h"

#include <algorithm>
#include <filesystem>
#include <set>
#include <sstream>

namespace velt::test {
namespace {

namespace fs = std::filesystem;

using Lines = std::vector<std::string>;

Json::Value get(const std::string& path) {
    const std::string request = "GET " + path + " HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n";
    const Answer answer = Client::unixSocket(worldRoot / "run/velt/veltd.sock").ask(request);
    EXPECT_EQ(answer.status, 200) << path << "\n" << answer.body;
    return answer.json();
}

std::map<std::string, std::string> filesOfState() {
    std::map<std::string, std::string> files;
    for (const auto& entry : fs::recursive_directory_iterator(worldRoot)) {
        const std::string name = fs::relative(entry.path(), worldRoot).string();
        // A session leaves traces in its daemon's own files, and in the records of what it did.
        const bool isOfSessions = contains(name, "/daemon/") || contains(name, "run/velt/sessions") ||
                                  contains(name, "lib/velt/transfers");
        if (entry.is_regular_file() && !contains(name, "log.db") && !isOfSessions) {
            files[name] = contentsOf(entry.path());
        }
    }
    return files;
}

/// The process of a daemon that listens; "" when there is none.
std::string listener(const std::string& stateFile) {
    std::istringstream lines(contentsOf(worldRoot / "run/velt" / stateFile));
    std::string key;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line);
        std::string pid;
        if (words >> key >> pid && key == "daemon") {
            return pid;
        }
    }
    return "";
}

Lines listeningSockets() {
    Lines sockets;
    for (const char* table : {"/proc/self/net/tcp", "/proc/self/net/tcp6"}) {
        std::istringstream lines(contentsOf(table));
        std::string number;
        std::string local;
        std::string remote;
        std::string state;
        for (std::string line; std::getline(lines, line);) {
            std::istringstream words(line);
            if (words >> number >> local >> remote >> state && state == "0A") {
                sockets.push_back(local);
            }
        }
    }
    std::ranges::sort(sockets);
    return sockets;
}

Lines openInFirewall() {
    const ProcessResult listed =
        runProcess({"nft", "--json", "list", "set", "inet", "velt_fileserv", "tcp_open"});
    Lines open;
    const Json::Value answer = jsonOf(listed.output);
    for (const Json::Value& each : answer["nftables"]) {
        for (const Json::Value& element : each["set"]["elem"]) {
            open.push_back(element.isObject()
                               ? element["range"][0].asString() + "-" + element["range"][1].asString()
                               : element.asString());
        }
    }
    std::ranges::sort(open);
    return open;
}

Lines eventsSoFar() {
    Lines events;
    std::istringstream lines(contentsOf(worldRoot / "var/log/velt/events.jsonl"));
    for (std::string line; std::getline(lines, line);) {
        const Json::Value event = jsonOf(line)["parameters"];
        events.push_back(event["SERVICE_NAME"].asString() + " " + event["SERVICE_ACTION"].asString());
    }
    return events;
}

/// Without the host's own entries.
Lines sentencesOfModules() {
    constexpr unsigned firstOwn = 0x11BF0000;
    Lines sentences;
    const Json::Value log = get("/api/log?limit=1000");
    for (const Json::Value& entry : log["entries"]) {
        if (std::stoul(entry["event"].asString(), nullptr, 0) < firstOwn) {
            sentences.insert(sentences.begin(), entry["text"].asString());
        }
    }
    return sentences;
}

/// How a plan calls the file; "" for one that no plan mentions.
std::string subjectOf(const std::string& file) {
    static const std::map<std::string, std::string> subjects{
        {"etc/velt/ftp.conf", "ftp settings"},
        {"etc/velt/sftp.conf", "sftp settings"},
        {"etc/velt/confinement.conf", "confinement settings"},
        {"etc/velt/chroot_rules", "chroot rules"},
        {"etc/veltinfo.conf", "system information"}};
    const auto known = subjects.find(file);
    if (known != subjects.end()) {
        return known->second;
    }
    const std::string name = file.substr(file.rfind('/') + 1);
    if (contains(file, "etc/velt/run-keys/")) {
        return "run key of " + name;
    }
    if (contains(file, "var/lib/velt/tls/")) {
        return "certificate";
    }
    return contains(file, "var/lib/velt/ssh/") ? "host keys" : "";
}

std::set<std::string> changedFiles(const SystemMoment& before, const SystemMoment& after) {
    std::set<std::string> names;
    for (const auto& [name, contents] : before.files) {
        const auto found = after.files.find(name);
        if (found == after.files.end() || found->second != contents) {
            names.insert(name);
        }
    }
    for (const auto& [name, contents] : after.files) {
        if (!before.files.contains(name)) {
            names.insert(name);
        }
    }
    return names;
}

std::string fateOf(const std::string& before, const std::string& after) {
    if (before == after) {
        return "";
    }
    return before.empty() ? "start" : after.empty() ? "stop" : "hand over";
}

Lines missingIn(const Lines& some, const Lines& others) {
    Lines missing;
    std::ranges::set_difference(some, others, std::back_inserter(missing));
    return missing;
}

void addEach(const char* effect, Lines subjects, std::size_t from, Lines& effects) {
    for (std::size_t i = from; i < subjects.size(); ++i) {
        effects.push_back(std::string(effect) + " " + subjects[i]);
    }
}

} // namespace

SystemMoment systemNow() {
    SystemMoment now;
    now.settings = get("/api/settings");
    now.log = sentencesOfModules();
    now.changes = get("/api/history?limit=1000")["changes"].size();
    now.files = filesOfState();
    now.daemons = {{"ftp", listener("ftpd.state")}, {"sftp", listener("sftp.state")}};
    now.listening = listeningSockets();
    now.firewall = openInFirewall();
    now.events = eventsSoFar();
    return now;
}

std::vector<std::string> differences(const SystemMoment& one, const SystemMoment& other) {
    Lines names;
    std::ranges::copy(changedFiles(one, other), std::back_inserter(names));
    const auto note = [&names](bool same, const char* name) {
        if (!same) {
            names.emplace_back(name);
        }
    };
    note(one.settings == other.settings, "settings");
    note(one.daemons == other.daemons, "daemons");
    note(one.listening == other.listening, "listening sockets");
    note(one.firewall == other.firewall, "firewall");
    note(one.log == other.log, "log");
    note(one.changes == other.changes, "history");
    return names;
}

std::vector<std::string> effectsBetween(const SystemMoment& before, const SystemMoment& after) {
    std::set<std::string> stored;
    for (const std::string& file : changedFiles(before, after)) {
        const std::string subject = subjectOf(file);
        if (!subject.empty()) {
            stored.insert("store " + subject);
        } else if (!file.starts_with("run/") && !file.starts_with("var/log/")) {
            stored.insert("change of " + file);
        }
    }
    Lines effects(stored.begin(), stored.end());
    for (const auto& [service, pid] : before.daemons) {
        const std::string fate = fateOf(pid, after.daemons.at(service));
        if (!fate.empty()) {
            effects.push_back(fate + " " + service);
        }
    }
    addEach("open port", missingIn(after.firewall, before.firewall), 0, effects);
    addEach("close port", missingIn(before.firewall, after.firewall), 0, effects);
    addEach("event", after.events, before.events.size(), effects);
    addEach("log", after.log, before.log.size(), effects);
    std::ranges::sort(effects);
    return effects;
}

Json::Value changesBetween(const SystemMoment& before, const SystemMoment& after) {
    Json::Value changes(Json::arrayValue);
    const auto compare = [&changes](const std::string& field, const Json::Value& from,
                                    const Json::Value& to) {
        if (from != to) {
            Json::Value change;
            change["field"] = field;
            change["from"] = from;
            change["to"] = to;
            changes.append(change);
        }
    };
    compare("/chroot_rules", before.settings["chroot_rules"], after.settings["chroot_rules"]);
    for (const char* section : {"confinement", "security", "ftp", "sftp"}) {
        const Json::Value& former = before.settings[section];
        for (const std::string& key : former.getMemberNames()) {
            compare("/" + std::string(section) + "/" + key, former[key], after.settings[section][key]);
        }
    }
    return changes;
}

} // namespace velt::test
