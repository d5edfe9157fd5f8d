#include "standalone/daemons/daemon_configuration.h"

#include "base/text.h"
#include "standalone/core/error_number.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"

#include <algorithm>

namespace velt {
namespace {

constexpr std::size_t longestPath = 1024;

} // namespace

bool isRenderable(const std::filesystem::path& path) {
    const std::string text = path.string();
    return path.is_absolute() && text.size() <= longestPath && std::ranges::none_of(text, isControl) &&
           text.find_first_of("\"\\%*=") == std::string::npos;
}

bool isPlainName(const std::string& name) {
    return name.find_first_not_of("abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789._-") ==
           std::string::npos;
}

Result<> checkRenderable(const std::filesystem::path& path, const std::filesystem::path& folder) {
    if (isRenderable(path)) {
        return {};
    }
    const bool tooLong = path.native().size() > longestPath;
    return Error(ErrorNumber::invalid,
                 "Cannot use the folder " + folder.string() + ": its path " +
                     (tooLong ? "is too long." : "may not contain \" \\ % * = or control characters."));
}

Result<> runConfigurationTest(const std::string& label, const std::vector<std::string>& arguments) {
    const auto result = runProcess(arguments);
    if (result && result->exitCode == 0) {
        return {};
    }
    return Error(ErrorNumber::daemon,
                 "The " + label + " daemon refuses its configuration: " + reasonOfEnd(result) + ".");
}

} // namespace velt
