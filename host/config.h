// The host's settings, from its command line and its configuration file.
#ifndef VELT_HOST_CONFIG_H
#define VELT_HOST_CONFIG_H

#include "host/http/server.h"

#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

namespace velt::host {

/// The settings are wrong; what() is a sentence for the administrator.
class ConfigError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

struct Config {
    std::filesystem::path stateRoot = "/";
    std::vector<std::filesystem::path> modules;
    std::filesystem::path socket; ///< empty: "run/velt/veltd.sock" below the state root
    std::vector<std::string> listen;
    bool allowRemote = false;
    TlsFiles tls;
    std::vector<std::string> hostNames;
    std::string adminGroup = "velt-admin";
    unsigned ioThreads = 2;
    unsigned workers = 4;
    std::chrono::milliseconds stopTime{60'000};
    HttpLimits limits;
    bool printReady = false;
    bool help = false;
    bool version = false;

    std::filesystem::path socketPath() const;
    std::filesystem::path tokenFile() const;
};

/// Reads the words after the program's name. An option on the command line overrides that of the
/// configuration file, lists included. Throws ConfigError, which names the option or key and what it takes.
Config readConfig(const std::vector<std::string>& words);

/// What --help prints.
const char* usage();

} // namespace velt::host

#endif
