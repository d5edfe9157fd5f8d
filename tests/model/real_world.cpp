#include "tests/model/real_world.h"

#include "ftp/ftp_library.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "standalone/daemons/sshd/sshd_plan.h"
#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/settings_store.h"
#include "tests/support/files.h"
#include "tests/system/support/files.h"

#include <fcntl.h>
#include <grp.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <stdexcept>

namespace velt::model {
namespace {
namespace fs = std::filesystem;

constexpr int firstPort = 2121;
// ProFTPD's master sleeps for at least 0.2 s when a session ends. So all of them end together, and the next
// world is served by others.
constexpr int turns = 4;

Node nodeOf(const struct stat& status, const std::string& path) {
    Node node{Kind::folder, status.st_uid, status.st_gid, status.st_mode & 0777U, status.st_ino, {}};
    if (S_ISLNK(status.st_mode)) {
        node.kind = Kind::link;
        node.text = fs::read_symlink(path);
    } else if (S_ISREG(status.st_mode)) {
        node.kind = Kind::file;
        node.text = test::contentsOf(path);
    }
    return node;
}

void lookBelow(const std::string& path, Tree& tree) {
    struct stat status {};
    if (lstat(path.c_str(), &status) != 0) {
        throw std::runtime_error("cannot look at " + path);
    }
    tree.nodes[path] = nodeOf(status, path);
    if (S_ISDIR(status.st_mode)) {
        for (const auto& entry : fs::directory_iterator(path)) {
            lookBelow(entry.path(), tree);
        }
    }
}

void writeTo(const std::string& path, const std::string& data, int flags) {
    const int file = open(path.c_str(), flags | O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666);
    if (file >= 0) {
        (void)!write(file, data.data(), data.size());
        close(file);
    }
}

mode_t modeOf(const std::string& text) {
    return static_cast<mode_t>(std::stoul(text, nullptr, 8));
}

std::string grantsText(const std::map<std::string, Access>& grants) {
    std::string text;
    for (const auto& [account, access] : grants) {
        const char* const word = access == Access::none ? "none" : access == Access::read ? "read" : "write";
        text += (text.empty() ? "\"" : ",\"") + account + "\":\"" + word + '"';
    }
    return "{" + text + "}";
}

std::string sharesText(const std::vector<Share>& shares) {
    std::string text;
    for (const Share& share : shares) {
        text += (text.empty() ? "" : ",") + std::string("{\"name\":\"") + share.name + "\",\"path\":\"" +
                share.path + "\",\"ftp\":" + (share.offered ? "true" : "false") +
                ",\"users\":" + grantsText(share.users) + ",\"groups\":" + grantsText(share.groups) + "}";
    }
    return "{\"version\":1,\"shares\":[" + text + "]}\n";
}

std::string ruleLine(const Rule& rule) {
    return rule.who.starts_with('@')
               ? "g:" + std::to_string(groupNumber(rule.who.substr(1)).value()) + ":" + rule.path
               : "u:" + std::to_string(accountOf(rule.who).uid) + ":" + rule.path;
}

// In a child process: the steps of a shell are system calls with the user's rights.
void doInShell(const Step& step, const std::string& data) {
    const std::string& what = step[2];
    const std::string& path = step[3];
    if (what == "mkdir") {
        mkdir(path.c_str(), 0777);
    } else if (what == "ln") {
        (void)!symlink(path.c_str(), step.at(4).c_str());
    } else if (what == "twin") {
        (void)link(path.c_str(), step.at(4).c_str());
    } else if (what == "mv") {
        (void)rename(path.c_str(), step.at(4).c_str());
    } else if (what == "rm") {
        unlink(path.c_str());
    } else if (what == "rmdir") {
        rmdir(path.c_str());
    } else if (what == "chmod") {
        chmod(step.at(4).c_str(), modeOf(path));
    } else if (what == "write") {
        writeTo(path, data, O_NOFOLLOW);
    }
}

bool become(const Account& account) {
    const std::vector<gid_t> groups(account.groups.begin(), account.groups.end());
    return setgroups(groups.size(), groups.data()) == 0 && setgid(groups[0]) == 0 && setuid(account.uid) == 0;
}

void storeSettings(const Switches& switches, int port) {
    _tag_VELT_FTP_CONF_ record{};
    if (VELTFTPConfGet(&record) != 0) {
        throw std::runtime_error("no settings");
    }
    std::snprintf(record.portnum, sizeof record.portnum, "%d", port);
    record.service_flags = VELT_FTP_SERVICE_PLAIN;
    record.user_chroot = switches.confined ? 1 : 0;
    record.anonymous = switches.anonymous ? 1 : 0;
    record.anonymous_chroot = switches.guestsShare.empty() ? 0 : 1;
    std::snprintf(record.anonymous_chroot_share, sizeof record.anonymous_chroot_share, "%s",
                  switches.guestsShare.c_str());
    if (VELTFTPConfSet(record) != 0) {
        throw std::runtime_error("the settings are refused");
    }
}

/// In the state root of now. `other` has one whose keys may be there.
Result<std::optional<DaemonPlan>> planSftp(int port, const std::string& other) {
    const char* const keys = "/var/lib/velt/ssh";
    // To make keys takes a while, and they tell nothing here.
    const fs::path own = statePath(keys);
    if (fs::exists(other + keys) && !fs::exists(own)) {
        fs::create_directories(own.parent_path());
        fs::copy(other + keys, own, fs::copy_options::recursive);
    }
    VELT_RETURN_IF_ERROR(storeConfinementSettings({true}));
    VELT_RETURN_IF_ERROR(storeSftpSettings({true, port}));
    return planSftpDaemon();
}

} // namespace

const std::vector<Switches>& possibleSwitches() {
    static const std::vector<Switches> all{
        {false, true, ""}, {true, true, "one"}, {true, false, ""}, {false, true, "two"}};
    return all;
}

RealWorld::RealWorld() {
    umask(0);
    for (const Switches& switches : possibleSwitches()) {
        add(switches, test::Protocol::sftp, -1);
        for (int turn = 0; turn < turns; turn++) {
            add(switches, test::Protocol::ftp, turn);
        }
    }
}

// At once, since each of them takes a while to end.
RealWorld::~RealWorld() {
    for (const Server& server : servers_) {
        if (server.daemon.pid() > 0) {
            kill(server.daemon.pid(), SIGTERM);
        }
    }
}

void RealWorld::add(const Switches& switches, test::Protocol protocol, int turn) {
    const int number = static_cast<int>(servers_.size());
    Server& server = servers_.emplace_back();
    server.switches = switches;
    server.protocol = protocol;
    server.turn = turn;
    server.port = firstPort + number;
    server.stateRoot = "/mnt/root/" + std::to_string(number);
    fs::create_directories(server.stateRoot);
    setStateRoot(server.stateRoot);
    storeSettings(switches, server.port);
    const auto plan =
        protocol == test::Protocol::ftp ? planFtpDaemon() : planSftp(server.port, servers_.front().stateRoot);
    if (!plan || !*plan || !server.daemon.start((*plan)->order)) {
        throw std::runtime_error("no daemon: " + (plan ? "it did not start" : plan.error().message));
    }
}

void RealWorld::clear() {
    turn_ = (turn_ + 1) % turns;
    for (const char* folder : {"/mnt/srv", "/mnt/home"}) {
        fs::remove_all(folder);
        fs::create_directories(folder);
        chmod(folder, 0755);
    }
    for (const Account& account : accounts()) {
        if (account.home.starts_with("/mnt/home/")) {
            fs::create_directories(account.home);
            (void)!chown(account.home.c_str(), account.uid, account.groups[0]);
            chmod(account.home.c_str(), 0755);
        }
    }
    storeShares({});
    storeRules({});
}

Tree RealWorld::look() const {
    Tree tree;
    for (const char* folder : {"/", "/mnt"}) {
        struct stat status {};
        stat(folder, &status);
        tree.nodes[folder] = nodeOf(status, folder);
    }
    lookBelow("/mnt/srv", tree);
    lookBelow("/mnt/home", tree);
    return tree;
}

void RealWorld::layDown(const Step& step, const std::string& data) const {
    const std::string& path = step[1];
    struct stat status {};
    if (lstat(path.c_str(), &status) == 0) {
        return; // what follows must not go through a link
    }
    if (step[0] == "link") {
        (void)!symlink(step.at(2).c_str(), path.c_str());
        return;
    }
    if (step[0] == "folder") {
        mkdir(path.c_str(), 0777);
    } else {
        writeTo(path, data, O_EXCL);
    }
    const unsigned uid = step.at(2) == "root" ? 0 : accountOf(step.at(2)).uid;
    (void)!lchown(path.c_str(), uid, uid == 0 ? 0 : accountOf(step.at(2)).groups[0]);
    chmod(path.c_str(), modeOf(step.at(3)));
}

void RealWorld::inShell(const Step& step, const std::string& data) const {
    static const std::set<std::string> known{"mkdir", "ln", "twin", "mv", "rm", "rmdir", "chmod", "write"};
    if (!known.contains(step.at(2)) || step.size() < 4) {
        throw std::invalid_argument("a shell knows nothing like " + formatStep(step));
    }
    const Account& account = accountOf(step.at(1));
    const pid_t child = fork();
    if (child == 0) {
        if (become(account)) {
            doInShell(step, data);
        }
        _exit(0);
    }
    waitpid(child, nullptr, 0);
}

void RealWorld::storeFile(const std::string& name, const std::string& text) const {
    for (const Server& server : servers_) {
        if (isServing(server)) {
            const std::string path = server.stateRoot + "/etc/velt/" + name;
            test::writeFile(path, text);
            chmod(path.c_str(), 0600);
        }
    }
}

void RealWorld::storeShares(const std::vector<Share>& shares) const {
    storeFile("shares.json", sharesText(shares));
}

void RealWorld::storeRules(const std::vector<Rule>& rules) const {
    std::string text = "velt-chroot-rules 1\n";
    for (const Rule& rule : rules) {
        text += ruleLine(rule) + "\n";
    }
    storeFile("chroot_rules", text);
}

std::unique_ptr<test::FileClient> RealWorld::logIn(const Switches& switches, const Account& account,
                                                   test::Protocol protocol) const {
    const auto server = std::ranges::find_if(servers_, [&](const Server& one) {
        return isServing(one) && one.protocol == protocol && one.switches.confined == switches.confined &&
               one.switches.anonymous == switches.anonymous &&
               one.switches.guestsShare == switches.guestsShare;
    });
    if (server == servers_.end()) {
        throw std::invalid_argument("no daemon runs with these switches");
    }
    return test::logInBy(protocol, server->port, account.name);
}

} // namespace velt::model
