#include "standalone/health/mends.h"

#include "standalone/core/systemd.h"

#include <algorithm>

namespace velt {
namespace {

constexpr const char* restartByUnit = "systemctl restart veltd";

bool isPlain(char letter) {
    constexpr std::string_view harmless = "_-./:,@+";
    return (letter >= 'a' && letter <= 'z') || (letter >= 'A' && letter <= 'Z') ||
           (letter >= '0' && letter <= '9') || harmless.find(letter) != std::string_view::npos;
}

} // namespace

std::string restartOf(const Daemon& daemon) {
    return "veltctl restart " + std::string(daemon.apiName);
}

std::string restartOfHost() {
    return systemdKeepsSupervisors() ? restartByUnit : "Restart veltd.";
}

std::string thenRestartHost(const std::string& first) {
    return first + (systemdKeepsSupervisors() ? std::string(", then run: ") + restartByUnit
                                              : ", then restart veltd.");
}

std::string correct(const std::filesystem::path& file) {
    return "Correct " + file.string() + ", then run: veltctl doctor";
}

std::string shellWord(std::string_view text) {
    if (!text.empty() && std::ranges::all_of(text, isPlain)) {
        return std::string(text);
    }
    std::string word = "'";
    for (const char letter : text) {
        word += letter == '\'' ? std::string(R"('\'')") : std::string(1, letter);
    }
    return word + "'";
}

} // namespace velt
