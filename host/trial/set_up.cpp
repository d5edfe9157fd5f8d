#include "host/trial/set_up.h"

#include "base/file.h"
#include "host/trial/trial_error.h"

#include <unistd.h>

namespace velt::host {

namespace {

constexpr int conflict = 409;
constexpr int triedPorts = 20;

void checkReply(const Reply& reply) {
    if (!reply.good()) {
        throw TrialError(reply.body["detail"].asString());
    }
}

/// Sets a service's port to the first one that is free.
void setPort(const VeltdClient& client, const std::string& target, Json::Value settings, int firstPort) {
    Reply reply{conflict, {}};
    for (int port = firstPort; port < firstPort + triedPorts && reply.status == conflict; ++port) {
        settings["portnum"] = port;
        reply = client.post(target, settings);
    }
    checkReply(reply);
}

/// The text as one word of a shell.
std::string quoted(const std::string& text) {
    std::string word = "'";
    for (const char c : text) {
        word += c == '\'' ? "'\\''" : std::string(1, c);
    }
    return word + "'";
}

} // namespace

std::string provideToken(VeltdClient& client) {
    if (const auto stored = valueOf(readOptionalFile(tokenName))) {
        std::string token = stored->substr(0, stored->find('\n'));
        client.setToken(token);
        if (!token.empty() && client.get("/healthz").good()) {
            return token;
        }
        client.setToken("");
    }
    Json::Value body(Json::objectValue);
    body["name"] = "quick-start";
    body["role"] = "admin";
    const Reply reply = client.post("/api/tokens", body);
    checkReply(reply);
    std::string token = reply.body["token"].asString();
    check(replaceFile(tokenName, token + "\n", 0600));
    client.setToken(token);
    return token;
}

void makeFirstSettings(const VeltdClient& client) {
    const std::string ftp = "/api/VELT.Core.FileServ.FTP";
    Json::Value settings(Json::objectValue);
    settings["enable_ftp"] = false;
    settings["enable_ftps"] = false;
    setPort(client, ftp + "/v3/set", settings, 2121);
    settings = Json::objectValue;
    settings["enable"] = false;
    setPort(client, ftp + ".SFTP/v1/set", settings, 2222);
    if (::geteuid() == 0) {
        settings = Json::objectValue;
        settings["user_chroot"] = true;
        settings["anonymous"] = true;
        settings["anonymous_chroot"] = true;
        settings["anonymous_chroot_share"] = "demo";
        checkReply(client.post(ftp + ".Security/v1/set", settings));
    }
}

void writeEnvironment(const std::string& url, const std::string& token,
                      const std::filesystem::path& programs) {
    const std::string folder = quoted(programs.string());
    check(replaceFile(environmentName,
                      "export VELT_URL=" + url + "\nexport VELT_TOKEN=" + token + "\ncase \":$PATH:\" in *:" +
                          folder + ":*) ;; *) export PATH=" + folder + ":$PATH ;; esac\n",
                      0600));
}

} // namespace velt::host
