#include "standalone/supervise/control_channel.h"

#include "base/input_wait.h"
#include "base/number_text.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <sstream>
#include <string_view>
#include <vector>

namespace velt {
namespace {

constexpr std::size_t largestMessage = 64UL * 1024;
constexpr std::string_view failure = "failed "; ///< begins an answer that is not "ok 3 0"
constexpr std::string_view success = "ok ";
/// How a start deals with sessions, and how its ports are had.
constexpr std::string_view endSessions = "end sessions";
constexpr std::string_view keepSessions = "keep sessions";
constexpr std::string_view renewing = "renew, "; ///< before the former
constexpr std::string_view sharedPorts = "shared ports";
constexpr std::string_view ownPorts = "own ports";
/// In the order of Command.
constexpr std::array<std::string_view, 4> commandNames{"start", "pause", "stop", "close"};

/// The socket's address by way of the folder's descriptor: a state root may lie deeper than the 107 bytes
/// that an address has room for.
class SocketAddress {
public:
    SocketAddress(const std::filesystem::path& folder, const std::string& daemon)
        : folder_(::open(folder.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC)) {
        const std::string path = "/proc/self/fd/" + std::to_string(folder_.get()) + "/" + daemon + ".sock";
        address_.sun_family = AF_UNIX;
        path.copy(address_.sun_path, sizeof address_.sun_path - 1);
    }

    const sockaddr* get() const { return reinterpret_cast<const sockaddr*>(&address_); }
    const char* path() const { return address_.sun_path; }
    static socklen_t size() { return sizeof(sockaddr_un); }

private:
    UniqueFd folder_;
    sockaddr_un address_{};
};

using Clock = std::chrono::steady_clock;

void limitSending(int descriptor, std::chrono::milliseconds limit) {
    timeval time{};
    time.tv_sec = limit.count() / 1000;
    time.tv_usec = (limit.count() % 1000) * 1000;
    ::setsockopt(descriptor, SOL_SOCKET, SO_SNDTIMEO, &time, sizeof time);
}

/// Repeats a call that a signal of the process has interrupted, as long as there is time.
template<class Call> bool succeeds(const Call& call, Clock::time_point deadline) {
    for (;;) {
        if (call() >= 0) {
            return true;
        }
        if (errno != EINTR || Clock::now() >= deadline) {
            return false;
        }
    }
}

std::optional<std::string> receiveMessage(int descriptor, Clock::time_point deadline) {
    if (!waitForInput(descriptor, deadline)) {
        return std::nullopt;
    }
    std::string message(largestMessage, '\0');
    const ssize_t length = ::recv(descriptor, message.data(), message.size(), MSG_DONTWAIT);
    if (length <= 0) {
        return std::nullopt;
    }
    message.resize(static_cast<std::size_t>(length));
    return message;
}

bool maySpeak(int descriptor) {
    ucred peer{};
    socklen_t size = sizeof peer;
    return ::getsockopt(descriptor, SOL_SOCKET, SO_PEERCRED, &peer, &size) == 0 &&
           (peer.uid == 0 || peer.uid == ::geteuid());
}

std::vector<std::string> splitFields(const std::string& message) {
    std::vector<std::string> fields;
    std::size_t begin = 0;
    for (std::size_t end = message.find('\0'); end != std::string::npos; end = message.find('\0', begin)) {
        fields.push_back(message.substr(begin, end - begin));
        begin = end + 1;
    }
    return fields;
}

std::string encodeAnswer(const Result<SessionCount>& done) {
    if (!done) {
        return std::string(failure) + done.error().message;
    }
    return std::string(success) + std::to_string(done->ended) + " " + std::to_string(done->kept);
}

/// A supervisor of another version may say no more than "ok".
Result<SessionCount> decodeAnswer(const std::string& answer) {
    if (answer.starts_with(failure)) {
        return Error(answer.substr(failure.size()));
    }
    SessionCount count;
    if (answer.starts_with(success)) {
        std::istringstream(answer.substr(success.size())) >> count.ended >> count.kept;
    }
    return count;
}

} // namespace

std::string encodeRequest(const ControlRequest& request) {
    std::string message;
    const auto add = [&message](std::string_view field) { message.append(field).push_back('\0'); };
    add(commandNames.at(static_cast<std::size_t>(request.command)));
    if (request.command == Command::start) {
        add(request.order.configurationHash);
        add(std::string(request.order.renew ? renewing : "")
                .append(request.endSessions ? endSessions : keepSessions));
        add(request.order.sharesPorts ? sharedPorts : ownPorts);
        add(std::to_string(request.order.ports.size()));
        for (const int port : request.order.ports) {
            add(std::to_string(port));
        }
        for (const std::string& argument : request.order.arguments) {
            add(argument);
        }
    }
    return message;
}

Result<ControlRequest> decodeRequest(const std::string& message) {
    const Error malformed(unknownRequest);
    const std::vector<std::string> fields = splitFields(message);
    const auto* const known = std::ranges::find(commandNames, fields.empty() ? "" : fields[0]);
    if (known == commandNames.end()) {
        return malformed;
    }
    ControlRequest request{static_cast<Command>(known - commandNames.begin()), {}};
    if (request.command != Command::start) {
        return request;
    }
    const auto number = [&fields](std::size_t index) {
        return static_cast<int>(index < fields.size() ? parseNumber(fields[index]).value_or(-1) : -1);
    };
    constexpr std::size_t firstPort = 5;
    const int portCount = number(4);
    if (portCount < 0 || fields.size() <= firstPort + static_cast<std::size_t>(portCount)) {
        return malformed;
    }
    const std::size_t firstArgument = firstPort + static_cast<std::size_t>(portCount);
    request.order.configurationHash = fields[1];
    request.order.renew = fields[2].starts_with(renewing);
    request.endSessions = fields[2].ends_with(endSessions);
    request.order.sharesPorts = fields[3] == sharedPorts;
    for (std::size_t index = firstPort; index < firstArgument; ++index) {
        request.order.ports.push_back(number(index));
    }
    request.order.arguments.assign(fields.begin() + static_cast<std::ptrdiff_t>(firstArgument), fields.end());
    return request;
}

ControlListener::ControlListener(const std::filesystem::path& folder, const std::string& daemon)
    : folder_(folder), daemon_(daemon), socket_(::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0)) {}

Result<ControlListener> ControlListener::open(const std::filesystem::path& folder,
                                              const std::string& daemon) {
    const SocketAddress address(folder, daemon);
    ::unlink(address.path());
    ControlListener listener(folder, daemon);
    // The supervisor's umask keeps other users out; the peer is checked in any case.
    if (::bind(listener.descriptor(), address.get(), SocketAddress::size()) != 0 ||
        ::chmod(address.path(), S_IRUSR | S_IWUSR) != 0 || ::listen(listener.descriptor(), 8) != 0) {
        return Error("cannot make the control socket in " + folder.string() + ": " + std::strerror(errno));
    }
    return listener;
}

ControlListener::~ControlListener() {
    if (socket_) {
        ::unlink(SocketAddress(folder_, daemon_).path());
    }
}

void ControlListener::serve(const std::function<Result<SessionCount>(const ControlRequest&)>& handle) {
    const UniqueFd peer(::accept4(descriptor(), nullptr, nullptr, SOCK_CLOEXEC));
    if (!peer || !maySpeak(peer.get())) {
        return;
    }
    constexpr std::chrono::seconds limit(
        1); // a peer that connects and says nothing delays the others no longer
    limitSending(peer.get(), limit);
    const auto message = receiveMessage(peer.get(), Clock::now() + limit);
    const auto request = decodeRequest(message.value_or(""));
    const std::string answer =
        encodeAnswer(request ? handle(*request) : Result<SessionCount>(request.error()));
    ::send(peer.get(), answer.data(), answer.size(), MSG_NOSIGNAL);
}

std::optional<Result<SessionCount>> askSupervisor(const std::filesystem::path& folder,
                                                  const std::string& daemon, const ControlRequest& request,
                                                  std::chrono::milliseconds limit) {
    const SocketAddress address(folder, daemon);
    const UniqueFd socket(::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0));
    const Clock::time_point deadline = Clock::now() + limit;
    limitSending(socket.get(), limit);
    const std::string message = encodeRequest(request);
    const auto connect = [&] { return ::connect(socket.get(), address.get(), SocketAddress::size()); };
    const auto send = [&] { return ::send(socket.get(), message.data(), message.size(), MSG_NOSIGNAL); };
    if (!succeeds(connect, deadline) || !succeeds(send, deadline)) {
        return std::nullopt;
    }
    const auto answer = receiveMessage(socket.get(), deadline);
    if (!answer) {
        return std::nullopt;
    }
    return decodeAnswer(*answer);
}

} // namespace velt
