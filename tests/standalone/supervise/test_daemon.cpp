// A daemon that behaves as its arguments say: what the supervisor is tried on.
//
//     velt-test-daemon [--port N]... [--delay MS] [--refuse WORDS] [--end-if FILE] [--say WORDS]...
//     [--stubborn] [--any] [--share]
//
// It ends by itself when there is a FILE, before or after it listens.
//
// It says the WORDS, each at once, before it listens.
//
// It listens on loopback, with --any on all addresses, with --share beside others that share the port; each
// connection is served by a session in a process and a terminal session of its own, which answers every byte
// with the same byte and ends with its connection, or with a SIGTERM.

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

namespace {

struct Options {
    std::vector<int> ports;
    int delay = 0;
    const char* endFile = nullptr;
    const char* words = nullptr;
    std::vector<std::string> messages;
    std::string sessionMessage; ///< at the beginning of each session
    bool stubborn = false;
    bool any = false;
    bool share = false;
};

int number(const char* text) {
    return static_cast<int>(std::strtol(text, nullptr, 10));
}

Options parse(int argc, char** argv) {
    Options options;
    for (int index = 1; index < argc; ++index) {
        const std::string_view name = argv[index];
        if (name == "--stubborn") {
            options.stubborn = true;
            continue;
        }
        if (name == "--any") {
            options.any = true;
            continue;
        }
        if (name == "--share") {
            options.share = true;
            continue;
        }
        const char* value = index + 1 < argc ? argv[++index] : "";
        if (name == "--port") {
            options.ports.push_back(number(value));
        } else if (name == "--delay") {
            options.delay = number(value);
        } else if (name == "--end-if") {
            options.endFile = value;
        } else if (name == "--refuse") {
            options.words = value;
        } else if (name == "--say") {
            options.messages.emplace_back(value);
        } else if (name == "--say-in-sessions") {
            options.sessionMessage = value;
        }
    }
    return options;
}

int listenOn(int port, const Options& options) {
    const int descriptor = ::socket(AF_INET, SOCK_STREAM, 0);
    const int on = 1;
    ::setsockopt(descriptor, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    if (options.share) {
        ::setsockopt(descriptor, SOL_SOCKET, SO_REUSEPORT, &on, sizeof on);
    }
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(options.any ? INADDR_ANY : INADDR_LOOPBACK);
    address.sin_port = htons(static_cast<in_port_t>(port));
    if (::bind(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
        ::listen(descriptor, 16) != 0) {
        std::perror("velt-test-daemon: cannot listen");
        std::exit(1);
    }
    return descriptor;
}

void endIfThere(const char* file) {
    if (::access(file, F_OK) == 0) {
        std::fprintf(stderr, "velt-test-daemon: told to end\n");
        ::_exit(7);
    }
}

[[noreturn]] void serveSession(int connection) {
    ::setsid();
    ::signal(SIGTERM, SIG_DFL);
    char byte = 0;
    while (::read(connection, &byte, 1) == 1 && ::write(connection, &byte, 1) == 1) {
    }
    ::_exit(0);
}

[[noreturn]] void serve(const std::vector<int>& listeners, const std::string& sessionMessage) {
    for (;;) {
        const int connection = ::accept(listeners.front(), nullptr, nullptr);
        if (connection >= 0 && ::fork() == 0) {
            for (const int listener : listeners) {
                ::close(listener);
            }
            if (::write(STDERR_FILENO, sessionMessage.data(), sessionMessage.size()) < 0) {
                ::_exit(1);
            }
            serveSession(connection);
        }
        ::close(connection);
    }
}

} // namespace

int main(int argc, char** argv) {
    const Options options = parse(argc, argv);
    if (options.words != nullptr) {
        std::fprintf(stderr, "%s\n", options.words);
        return 1;
    }
    for (const std::string& message : options.messages) {
        if (::write(STDERR_FILENO, message.data(), message.size()) < 0) {
            return 1;
        }
    }
    if (options.stubborn) {
        ::signal(SIGTERM, SIG_IGN);
    }
    ::signal(SIGCHLD, SIG_IGN);
    std::this_thread::sleep_for(std::chrono::milliseconds(options.delay));
    if (options.endFile != nullptr) {
        endIfThere(options.endFile);
        std::thread([file = options.endFile] {
            for (;; std::this_thread::sleep_for(std::chrono::milliseconds(5))) {
                endIfThere(file);
            }
        }).detach();
    }
    std::vector<int> listeners;
    for (const int port : options.ports) {
        listeners.push_back(listenOn(port, options));
    }
    while (listeners.empty()) {
        ::pause();
    }
    serve(listeners, options.sessionMessage);
}
