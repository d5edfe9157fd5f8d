#include "tests/system/support/file_client.h"

#include "tests/system/support/ftp_session.h"
#include "tests/system/support/sftp_session.h"

#include <algorithm>
#include <cstdio>
#include <ctime>
#include <sstream>

namespace velt::test {
namespace {

class FtpFileClient final : public FileClient {
public:
    FtpFileClient(int port, const std::string& user, const std::string& password) : session_(port) {
        loggedIn_ = session_.logIn(user, password) == 230;
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
    bool makeFolder(const std::string& path) override { return done("MKD " + path); }
    bool remove(const std::string& path) override { return done("DELE " + path); }
    bool removeFolder(const std::string& path) override { return done("RMD " + path); }
    bool rename(const std::string& from, const std::string& to) override {
        return done("RNFR " + from) && done("RNTO " + to);
    }
    bool setMode(const std::string& path, unsigned mode) override {
        std::ostringstream digits;
        digits << std::oct << mode;
        return done("SITE CHMOD " + digits.str() + " " + path);
    }
    bool setTimes(const std::string& path, std::uint32_t seconds) override;
    bool symbolicLink(const std::string& target, const std::string& path) override {
        return done("SITE SYMLINK " + target + " " + path);
    }

private:
    // The server says goodbye with 421; a connection that ends without a word has ended, too.
    bool done(const std::string& command) {
        const int code = session_.command(command).code;
        ended_ = code == 421 || code == 0;
        return code != 0 && code < 400;
    }

    FtpSession session_;
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

std::optional<std::set<std::string>> FtpFileClient::list(const std::string& path, Listing how) {
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

bool FtpFileClient::setTimes(const std::string& path, std::uint32_t seconds) {
    const std::time_t time = seconds;
    std::tm parts{};
    gmtime_r(&time, &parts);
    char text[32];
    (void)std::strftime(text, sizeof text, "%Y%m%d%H%M%S", &parts);
    return done("MFMT " + std::string(text) + " " + path);
}

class SftpFileClient final : public FileClient {
public:
    SftpFileClient(int port, const std::string& user, const std::string& password)
        : session_(port, user, password) {}

    bool isLoggedIn() const override { return session_.isOpen(); }
    bool hasEnded() const override { return !session_.isOpen(); }
    bool enter(const std::string& path) override { return good(session_.look(path + "/.")); }
    std::optional<std::set<std::string>> list(const std::string& path, Listing) override {
        const auto names = session_.list(path);
        return names ? std::optional(std::set(names->begin(), names->end())) : std::nullopt;
    }
    std::optional<std::string> read(const std::string& path) override { return session_.receive(path); }
    bool write(const std::string& path, const std::string& data) override {
        return good(session_.send(path, data));
    }
    bool append(const std::string& path, const std::string& data) override {
        return good(session_.send(path, data, sftpWrite | sftpMake | sftpAppend));
    }
    bool makeFolder(const std::string& path) override { return good(session_.makeFolder(path)); }
    bool remove(const std::string& path) override { return good(session_.remove(path)); }
    bool removeFolder(const std::string& path) override { return good(session_.removeFolder(path)); }
    bool rename(const std::string& from, const std::string& to) override {
        return good(session_.rename(from, to));
    }
    bool setMode(const std::string& path, unsigned mode) override {
        return good(session_.setMode(path, mode));
    }
    bool setTimes(const std::string& path, std::uint32_t seconds) override {
        return good(session_.setTimes(path, seconds));
    }
    bool symbolicLink(const std::string& target, const std::string& path) override {
        return good(session_.symbolicLink(target, path));
    }
    bool hardLink(const std::string& from, const std::string& to) override {
        return good(session_.hardLink(from, to));
    }
    bool replace(const std::string& from, const std::string& to) override {
        return good(session_.move(from, to));
    }
    bool cut(const std::string& path) override { return good(session_.cut(path, 0)); }
    bool open(const std::string& path, Opening opening) override;
    std::optional<std::string> readOpen() override { return session_.receiveOpen(handle_); }
    bool writeOpen(const std::string& data) override { return good(session_.sendOpen(handle_, data)); }
    bool setModeOfOpen(unsigned mode) override { return good(session_.setModeOfHandle(handle_, mode)); }

private:
    static bool good(int status) { return status == sftpGood; }

    SftpSession session_;
    std::string handle_; ///< "" before the first file is opened
};

bool SftpFileClient::open(const std::string& path, Opening opening) {
    if (!handle_.empty()) {
        session_.close(handle_);
    }
    handle_ = session_.open(path, opening == Opening::toRead ? sftpRead : sftpWrite | sftpMake).value_or("");
    return !handle_.empty();
}

} // namespace

bool FileClient::hardLink(const std::string&, const std::string&) {
    return false;
}

bool FileClient::replace(const std::string&, const std::string&) {
    return false;
}

bool FileClient::cut(const std::string&) {
    return false;
}

bool FileClient::open(const std::string&, Opening) {
    return false;
}

std::optional<std::string> FileClient::readOpen() {
    return std::nullopt;
}

bool FileClient::writeOpen(const std::string&) {
    return false;
}

bool FileClient::setModeOfOpen(unsigned) {
    return false;
}

std::unique_ptr<FileClient> logInBy(Protocol protocol, int port, const std::string& user) {
    const bool guest = user == "ftp" && protocol == Protocol::ftp;
    return guest ? logInBy(protocol, port, "anonymous", "a@b")
                 : logInBy(protocol, port, user, user + "-secret");
}

std::unique_ptr<FileClient> logInBy(Protocol protocol, int port, const std::string& user,
                                    const std::string& password) {
    if (protocol == Protocol::ftp) {
        return std::make_unique<FtpFileClient>(port, user, password);
    }
    return std::make_unique<SftpFileClient>(port, user, password);
}

} // namespace velt::test
