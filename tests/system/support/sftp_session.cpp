#include "tests/system/support/sftp_session.h"

#include "base/file.h"
#include "tests/support/waiting.h"
#include "tests/system/support/sftp_packet.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <csignal>
#include <fstream>
#include <stdexcept>
#include <utility>

namespace velt::test {

using namespace packet;

namespace {

/// A program that tells the password which stands in its environment.
const std::string& askProgram() {
    static const std::string path = "/mnt/tell-password";
    if (::access(path.c_str(), X_OK) != 0) {
        std::ofstream(path) << "#!/bin/sh\necho \"$VELT_PASSWORD\"\n";
        ::chmod(path.c_str(), 0755);
    }
    return path;
}

std::vector<char*> pointersTo(std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    for (std::string& each : texts) {
        pointers.push_back(each.data());
    }
    pointers.push_back(nullptr);
    return pointers;
}

UniqueFd makePipe(UniqueFd& other, bool other_reads) {
    std::array<int, 2> ends{-1, -1};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
        throw std::runtime_error("no pipe");
    }
    other = UniqueFd(ends[other_reads ? 0 : 1]);
    return UniqueFd(ends[other_reads ? 1 : 0]);
}

bool readExactly(int descriptor, char* data, std::size_t size) {
    const auto deadline = Clock::now() + patience;
    while (size > 0) {
        pollfd waiting{descriptor, POLLIN, 0};
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
        const ssize_t got =
            left > 0 && poll(&waiting, 1, static_cast<int>(left)) == 1 ? ::read(descriptor, data, size) : 0;
        if (got <= 0) {
            return false;
        }
        data += got;
        size -= static_cast<std::size_t>(got);
    }
    return true;
}

} // namespace

SftpSession::SftpSession(int port, const std::string& user, const std::string& password) {
    std::vector<std::string> arguments{"ssh",
                                       "-s",
                                       "-F",
                                       "/dev/null",
                                       "-oStrictHostKeyChecking=no",
                                       "-oUserKnownHostsFile=/dev/null",
                                       "-oGlobalKnownHostsFile=/dev/null",
                                       "-oPubkeyAuthentication=no",
                                       "-oNumberOfPasswordPrompts=1",
                                       "-oLogLevel=ERROR",
                                       "-p" + std::to_string(port),
                                       user + "@127.0.0.1",
                                       "sftp"};
    std::vector<std::string> environment{"PATH=/usr/bin:/bin", "SSH_ASKPASS=" + askProgram(),
                                         "SSH_ASKPASS_REQUIRE=force", "VELT_PASSWORD=" + password};
    UniqueFd input;
    UniqueFd output;
    UniqueFd errors;
    toClient_ = makePipe(input, true);
    fromClient_ = makePipe(output, false);
    errors_ = makePipe(errors, false);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, input.get(), 0);
    posix_spawn_file_actions_adddup2(&actions, output.get(), 1);
    posix_spawn_file_actions_adddup2(&actions, errors.get(), 2);
    const int error = posix_spawn(&client_, "/usr/bin/ssh", &actions, nullptr, pointersTo(arguments).data(),
                                  pointersTo(environment).data());
    posix_spawn_file_actions_destroy(&actions);
    if (error != 0) {
        throw std::runtime_error("ssh cannot be started");
    }
    ::signal(SIGPIPE, SIG_IGN);
    input = UniqueFd();
    output = UniqueFd();
    errors = UniqueFd();
    open_ = writePacket(kindInit, number(3)) && readPacket().type == 2;
}

SftpSession::SftpSession(SftpSession&& other) noexcept
    : client_(std::exchange(other.client_, -1)), toClient_(std::move(other.toClient_)),
      fromClient_(std::move(other.fromClient_)), errors_(std::move(other.errors_)), open_(other.open_),
      number_(other.number_), lastStatus_(other.lastStatus_) {}

SftpSession::~SftpSession() {
    if (client_ > 0) {
        ::kill(client_, SIGKILL);
        ::waitpid(client_, nullptr, 0);
    }
}

std::string SftpSession::words() {
    toClient_ = UniqueFd();
    return readAll(errors_.get()).value_or("");
}

bool SftpSession::writePacket(int type, const std::string& body) {
    return writeAll(toClient_.get(),
                    number(static_cast<std::uint32_t>(body.size() + 1)) + static_cast<char>(type) + body);
}

SftpSession::Packet SftpSession::readPacket() {
    std::string length(4, '\0');
    if (!readExactly(fromClient_.get(), length.data(), length.size())) {
        return {};
    }
    std::string packet(takeNumber(length), '\0');
    if (packet.empty() || !readExactly(fromClient_.get(), packet.data(), packet.size())) {
        return {};
    }
    return {static_cast<unsigned char>(packet.front()), packet.substr(1)};
}

SftpSession::Packet SftpSession::ask(int type, const std::string& body) {
    Packet answer = open_ && writePacket(type, number(++number_) + body) ? readPacket() : Packet();
    if (answer.type < 0) {
        open_ = false;
    } else {
        takeNumber(answer.body); // one request at a time
    }
    return answer;
}

int SftpSession::statusOf(const Packet& answer) {
    std::string body = answer.body;
    lastStatus_ = answer.type == kindStatus ? static_cast<int>(takeNumber(body))
                  : answer.type < 0         ? sftpEnded
                                            : sftpGood;
    return lastStatus_;
}

int SftpSession::status(int type, const std::string& body) {
    return statusOf(ask(type, body));
}

std::optional<std::string> SftpSession::handleOf(int type, const std::string& body) {
    Packet answer = ask(type, body);
    statusOf(answer);
    return answer.type == kindHandle ? std::optional(takeText(answer.body)) : std::nullopt;
}

std::optional<std::string> SftpSession::nameOf(int type, const std::string& path) {
    Packet answer = ask(type, text(path));
    if (answer.type != kindName) {
        return std::nullopt;
    }
    takeNumber(answer.body);
    return takeText(answer.body);
}

std::optional<std::string> SftpSession::open(const std::string& path, std::uint32_t how,
                                             std::optional<std::uint32_t> mode) {
    return handleOf(kindOpen, text(path) + number(how) + modeAttribute(mode));
}

int SftpSession::close(const std::string& handle) {
    return status(kindClose, text(handle));
}

std::optional<std::string> SftpSession::receiveOpen(const std::string& handle) {
    std::string all;
    for (;;) {
        Packet answer = ask(kindRead, text(handle) + number64(all.size()) + number(32768));
        if (answer.type != kindData) {
            return statusOf(answer) == 1 ? std::optional(all) : std::nullopt;
        }
        all += takeText(answer.body);
    }
}

std::optional<std::string> SftpSession::receive(const std::string& path) {
    const auto handle = open(path, sftpRead);
    if (!handle) {
        return std::nullopt;
    }
    auto all = receiveOpen(*handle);
    close(*handle);
    return all;
}

int SftpSession::look(const std::string& path) {
    return status(kindLook, text(path));
}

int SftpSession::sendOpen(const std::string& handle, const std::string& data) {
    return status(kindWrite, text(handle) + number64(0) + text(data));
}

std::optional<std::string> SftpSession::read(const std::string& handle) {
    Packet answer = ask(kindRead, text(handle) + number64(0) + number(32768));
    return answer.type == kindData ? std::optional(takeText(answer.body)) : std::nullopt;
}

int SftpSession::send(const std::string& path, const std::string& data, std::uint32_t how,
                      std::optional<std::uint32_t> mode) {
    const auto handle = open(path, how, mode);
    if (!handle) {
        return lastStatus_;
    }
    const int written = sendOpen(*handle, data);
    const int closed = close(*handle);
    return written != sftpGood ? written : closed;
}

std::optional<std::vector<std::string>> SftpSession::list(const std::string& folder) {
    const auto handle = handleOf(kindOpenFolder, text(folder));
    if (!handle) {
        return std::nullopt;
    }
    std::vector<std::string> names;
    for (;;) {
        Packet answer = ask(kindReadFolder, text(*handle));
        if (answer.type != kindName) {
            break;
        }
        for (std::uint32_t count = takeNumber(answer.body); count > 0; count--) {
            std::string name = takeText(answer.body);
            takeText(answer.body);
            skipAttributes(answer.body);
            if (name != "." && name != "..") {
                names.push_back(std::move(name));
            }
        }
    }
    close(*handle);
    std::ranges::sort(names);
    return names;
}

std::optional<std::string> SftpSession::target(const std::string& link) {
    return nameOf(kindTarget, link);
}

std::optional<std::string> SftpSession::realPath(const std::string& path) {
    return nameOf(kindRealPath, path);
}

int SftpSession::makeFolder(const std::string& path) {
    return status(kindMakeFolder, text(path) + number(0));
}

int SftpSession::removeFolder(const std::string& path) {
    return status(kindRemoveFolder, text(path));
}

int SftpSession::remove(const std::string& path) {
    return status(kindRemove, text(path));
}

int SftpSession::rename(const std::string& from, const std::string& to) {
    return status(kindRename, text(from) + text(to));
}

int SftpSession::move(const std::string& from, const std::string& to) {
    return status(kindExtended, text("posix-rename@openssh.com") + text(from) + text(to));
}

int SftpSession::hardLink(const std::string& from, const std::string& to) {
    return status(kindExtended, text("hardlink@openssh.com") + text(from) + text(to));
}

int SftpSession::symbolicLink(const std::string& target, const std::string& path) {
    // In this order OpenSSH takes them.
    return status(kindSymbolicLink, text(target) + text(path));
}

int SftpSession::setMode(const std::string& path, std::uint32_t mode) {
    return status(kindSet, text(path) + modeAttribute(mode));
}

int SftpSession::setOwner(const std::string& path, std::uint32_t user, std::uint32_t group) {
    return status(kindSet, text(path) + number(hasOwner) + number(user) + number(group));
}

int SftpSession::setTimes(const std::string& path, std::uint32_t seconds) {
    return status(kindSet, text(path) + timesAttribute(seconds));
}

int SftpSession::cut(const std::string& path, std::uint64_t length) {
    return status(kindSet, text(path) + number(hasSize) + number64(length));
}

int SftpSession::cutHandle(const std::string& handle, std::uint64_t length) {
    return status(kindSetOpen, text(handle) + number(hasSize) + number64(length));
}

int SftpSession::setModeOfLink(const std::string& path, std::uint32_t mode) {
    return status(kindExtended, text("lsetstat@openssh.com") + text(path) + modeAttribute(mode));
}

int SftpSession::setModeOfHandle(const std::string& handle, std::uint32_t mode) {
    return status(kindSetOpen, text(handle) + modeAttribute(mode));
}

int SftpSession::setTimesOfOpen(const std::string& path, std::uint32_t seconds) {
    return ofOpen(path, [&](const std::string& handle) {
        return status(kindSetOpen, text(handle) + timesAttribute(seconds));
    });
}

} // namespace velt::test
