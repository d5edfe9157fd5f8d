#include "tests/model/ftp_client.h"

#include "tests/system/support/ftp_session.h"

#include <algorithm>
#include <sstream>
#include <stdexcept>

namespace velt::model {
namespace {

class FtpClient final : public Client {
public:
    FtpClient(int port, const Account& account) : session_(port) {
        const bool guest = account.name == "ftp";
        loggedIn_ = session_.logIn(guest ? "anonymous" : account.name,
                                   guest ? "a@b" : account.name + "-secret") == 230;
    }

    bool isLoggedIn() const override { return loggedIn_; }
    bool hasEnded() const override { return ended_; }
    bool enter(const std::string& path) override { return done("CWD " + path); }
    std::optional<std::set<std::string>> list(const std::string& path, Listing how) override;
    std::optional<std::string> read(const std::string& path) override {
        return session_.receive("RETR " + path);
    }
    bool write(const std::string& path, const std::string& data) override {
        return session_.send("STOR " + path, data) == 226;
    }
    bool append(const std::string& path, const std::string& data) override {
        return session_.send("APPE " + path, data) == 226;
    }
    bool make(const std::string& path) override { return done("MKD " + path); }
    bool remove(const std::string& path) override { return done("DELE " + path); }
    bool removeFolder(const std::string& path) override { return done("RMD " + path); }
    bool rename(const std::string& from, const std::string& to) override {
        return done("RNFR " + from) && done("RNTO " + to);
    }
    bool changeMode(const std::string& path, const std::string& mode) override {
        return done("SITE CHMOD " + mode + " " + path);
    }

private:
    bool done(const std::string& command) {
        const int code = session_.command(command).code;
        if (code == 0) {
            throw std::runtime_error("the server ended the session at " + command);
        }
        ended_ = code == 421;
        return code < 400;
    }

    test::FtpSession session_;
    bool loggedIn_ = false;
    bool ended_ = false;
};

// The name in a line of LIST, MLSD or NLST.
std::string nameIn(const std::string& line, Listing how) {
    if (how == Listing::facts) {
        return line.find("type=cdir") != std::string::npos || line.find("type=pdir") != std::string::npos
                   ? ""
                   : line.substr(std::min(line.find(' '), line.size() - 1) + 1);
    }
    const std::string shown = line.substr(0, line.find(" -> "));
    const auto start = shown.find_last_of(how == Listing::list ? " /" : "/");
    return start == std::string::npos ? shown : shown.substr(start + 1);
}

std::optional<std::set<std::string>> FtpClient::list(const std::string& path, Listing how) {
    const char* const command = how == Listing::list ? "LIST " : how == Listing::names ? "NLST " : "MLSD ";
    const auto listing = session_.receive(command + path);
    if (!listing) {
        return std::nullopt;
    }
    std::set<std::string> names;
    std::istringstream lines(*listing);
    for (std::string line; std::getline(lines, line);) {
        while (line.ends_with('\r')) {
            line.pop_back();
        }
        if (const std::string name = line.empty() ? "" : nameIn(line, how); !name.empty()) {
            names.insert(name);
        }
    }
    return names;
}

} // namespace

std::unique_ptr<Client> logInByFtp(int port, const Account& account) {
    return std::make_unique<FtpClient>(port, account);
}

} // namespace velt::model
