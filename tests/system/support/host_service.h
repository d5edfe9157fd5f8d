// Tests in which veltctl and curl administer the real daemons through the real veltd.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_HOST_SERVICE_H
#define VELT_TESTS_SYSTEM_SUPPORT_HOST_SERVICE_H

#include "tests/system/support/clients.h"
#include "tests/system/support/files.h"
#include "tests/system/support/private_world.h"
#include "tests/system/support/running_program.h"

#include <gtest/gtest.h>
#include <json/value.h>

#include <string>
#include <vector>

namespace velt::test {

/// What an HTTP client got.
struct HttpResult {
    int status = 0; ///< 0: no answer
    std::string body;
    Json::Value json; ///< null when the body is none
};

Json::Value jsonOf(const std::string& text);
std::string textOf(const Json::Value& value);

class HostService : public testing::Test {
protected:
    using Words = std::vector<std::string>;

    static constexpr int port = ftpTestPort;
    static constexpr const char* ftpApi = "/api/VELT.Core.FileServ.FTP/v3/";
    static constexpr const char* securityApi = "/api/VELT.Core.FileServ.FTP.Security/v1/";
    static constexpr const char* usersApi = "/api/VELT.Core.FileServ.FTP.ChrootUser/v1/";
    static constexpr const char* rulesApi = "/api/VELT.Core.FileServ.FTP.ChrootUser/v2/";
    static constexpr const char* sftpApi = "/api/VELT.Core.FileServ.FTP.SFTP/v1/";

    /// A fresh state root, homes and shares, and veltd on its socket and on a free TCP port. Both services
    /// are off, their ports unprivileged, and users are confined to their homes.
    void SetUp() override;
    /// Switches both services off and ends veltd. No process, mount or listening port may be left then.
    void TearDown() override;

    void startHost();
    /// Ends it in order and tells its exit code.
    int stopHost();
    /// Ends it at once.
    void killHost();

    /// veltctl over the Unix socket, as root.
    static ProcessResult veltctl(Words words, const std::string& input = {});
    /// The same, which has to succeed.
    static std::string done(const Words& words, const std::string& input = {});
    /// veltctl over TCP with a token.
    ProcessResult veltctlWith(const std::string& token, Words words) const;
    /// veltctl over the Unix socket as a user of the world.
    static ProcessResult veltctlAs(unsigned user, Words words);

    /// curl over TCP with the administrator's token. The body "" is a GET.
    HttpResult curl(const std::string& path, const std::string& body = {},
                    const Words& furtherArguments = {}) const;

    std::string makeToken(const std::string& name, const std::string& role) const;

    /// The document of all settings.
    static std::string exported();

    /// What the host wrote to its standard error so far.
    static std::string hostLog();

    Words hostArguments; ///< of veltd, beside the usual ones
    /// Where the next veltd has the other programs.
    std::string programFolder = VELT_BUILT_FOLDER;
    RunningProgram host;
    int tcpPort = 0;
    std::string adminToken;

private:
    std::string mounts_;
};

} // namespace velt::test

#endif
