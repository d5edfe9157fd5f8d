#include "tests/system/support/watched_veltd.h"

#include "base/unique_fd.h"
#include "tests/load/stand_in_daemons.h"
#include "tests/support/files.h"
#include "tests/support/waiting.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>

namespace velt::test {
namespace fs = std::filesystem;

namespace {

const fs::path errorFile = "/mnt/watched-veltd.log";
const std::string socketPath = worldRoot / "run/velt/veltd.sock";

bool hasEnded(pid_t child) {
    siginfo_t info{};
    return waitid(P_PID, static_cast<id_t>(child), &info, WEXITED | WNOHANG | WNOWAIT) != 0 ||
           info.si_pid == child;
}

} // namespace

void WatchedVeltd::SetUp() {
    ASSERT_TRUE(!whyNoWorld().empty() || mountStandInDaemons());
    HostService::SetUp();
    if (!IsSkipped() && !HasFatalFailure()) {
        ASSERT_EQ(stopHost(), 0) << hostLog();
    }
}

std::string WatchedVeltd::becomeVeltd(const Words& further) {
    const std::string built = VELT_BUILT_FOLDER;
    Words words{built + "/veltd",
                "--state-root",
                worldRoot,
                "--module",
                built + "/VELT.Core.FileServ.FTP.so",
                "--listen",
                "127.0.0.1:" + std::to_string(veltdPort)};
    words.insert(words.end(), further.begin(), further.end());
    std::vector<char*> arguments;
    for (std::string& word : words) {
        arguments.push_back(word.data());
    }
    arguments.push_back(nullptr);
    const UniqueFd errors(open(errorFile.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600));
    dup2(errors.get(), STDERR_FILENO);
    clearenv();
    setenv("PATH", "/usr/sbin:/usr/bin:/sbin:/bin", 1);
    setenv("LANG", "C.UTF-8", 1);
    setenv("VELT_LIBEXEC_DIR", built.c_str(), 1);
    execv(arguments[0], arguments.data());
    return "cannot be started";
}

bool WatchedVeltd::answers(pid_t veltd) {
    bool answers = false;
    waitUntil(
        [&] {
            answers = ask("GET", "/healthz").status == 200;
            return answers || hasEnded(veltd);
        },
        std::chrono::seconds(10));
    return answers;
}

std::string WatchedVeltd::words() {
    return contentsOf(errorFile);
}

Answer WatchedVeltd::ask(const std::string& method, const std::string& target, const std::string& body) {
    Client client = Client::unixSocket(socketPath);
    return client.connected() ? client.ask(requestText(method, target, "", body)) : Answer();
}

bool WatchedVeltd::isVeltds(const SeenCall& call) {
    return call.ofChild && call.program == "veltd" && !isLoading(call);
}

std::set<std::string> WatchedVeltd::files() {
    std::set<std::string> names;
    for (const auto& entry : fs::recursive_directory_iterator(worldRoot)) {
        const std::string name = entry.path().lexically_relative(worldRoot);
        if (!name.starts_with("var/lib/velt/log.db-") && !name.starts_with("run/velt/test.")) {
            names.insert(name);
        }
    }
    return names;
}

bool isSentence(const std::string& text) {
    constexpr std::size_t shortest = 12;
    return text.size() >= shortest && text.ends_with('.') && text.find("Success") == std::string::npos;
}

} // namespace velt::test
