// A test of the command line against a server in this process.
#ifndef VELT_TESTS_CLI_CLI_TEST_H
#define VELT_TESTS_CLI_CLI_TEST_H

#include "cli/program.h"
#include "tests/cli/fake_host.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <map>
#include <optional>
#include <string>
#include <vector>

/// What a run left behind.
struct RunResult {
    int code = -1;
    std::string out;
    std::string err;
};

/// A folder of the test's own, by names as texts, which commands take.
class TemporaryFolder {
public:
    std::string path(const std::string& name) const { return (folder_.path() / name).string(); }

    /// Writes a file and returns its path.
    std::string write(const std::string& name, const std::string& text) const {
        return folder_.write(name, text).string();
    }

private:
    velt::test::TemporaryFolder folder_;
};

class CliTest : public testing::Test {
protected:
    using Words = std::vector<std::string>;

    /// Runs the command in this process, over the Unix socket unless the environment says otherwise.
    RunResult run(const Words& words, const std::string& input = {});

    /// The bodies of the requests "METHOD /target" so far.
    std::vector<Json::Value> sent(const std::string& request) const;

    /// "METHOD /target" of all requests.
    std::vector<std::string> asked() const;

    TemporaryFolder folder;
    FakeHost host;
    HttpServer server{folder.path("veltd.sock"),
                      [this](const HttpRequest& request) { return host.handle(request); }};
    std::map<std::string, std::string> environment{{"VELT_SOCKET", server.socketPath()}};
    int interruptionsAsked = 0;
    bool interrupted = false;
    int interrupt = 0; ///< the user interrupts before it is asked so often; 0: does not
    bool outputIsTerminal = false;
};

/// Every command as its words ("chroot rules add"), with its options ("--json").
struct CommandDescription {
    std::string words;
    std::vector<std::string> options;
};
std::vector<CommandDescription> describeCommands();

/// Runs a program and waits for it; its environment is `environment` alone.
RunResult runProcess(const std::vector<std::string>& arguments, const std::vector<std::string>& environment);

inline constexpr const char* ftpGet = "GET /api/VELT.Core.FileServ.FTP/v3/get";
inline const std::string change = "PATCH /api/settings";
inline constexpr const char* sftpSet = "POST /api/VELT.Core.FileServ.FTP.SFTP/v1/set";

#endif
