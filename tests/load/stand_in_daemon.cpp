// Stands in for the FTP and the SFTP daemon where what they serve does not matter: takes every configuration,
// listens at once on the port that stands there, and ends with each connection as soon as it is made.

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string>

namespace {

int portOf(const char* configuration) {
    std::ifstream file(configuration);
    for (std::string line; std::getline(file, line);) {
        std::istringstream words(line);
        std::string key;
        int port = 0;
        if (words >> key >> port && key == "Port") {
            return port;
        }
    }
    return 0;
}

int listenOn(int port) {
    const int descriptor = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const int on = 1;
    ::setsockopt(descriptor, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    ::setsockopt(descriptor, SOL_SOCKET, SO_REUSEPORT, &on, sizeof on); // as a successor of its like needs it
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<in_port_t>(port));
    const bool listens =
        ::bind(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 &&
        ::listen(descriptor, 16) == 0;
    return listens ? descriptor : -1;
}

} // namespace

int main(int argc, char** argv) {
    const char* configuration = nullptr;
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "-t") == 0) {
            return 0;
        }
        const bool names = std::strcmp(argv[i], "-c") == 0 || std::strcmp(argv[i], "-f") == 0;
        configuration = names && i + 1 < argc ? argv[i + 1] : configuration;
    }
    const int listener = configuration == nullptr ? -1 : listenOn(portOf(configuration));
    if (listener < 0) {
        std::perror("stand-in daemon");
        return 1;
    }
    for (;;) {
        ::close(::accept(listener, nullptr, nullptr));
    }
}
