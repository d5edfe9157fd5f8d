#include "standalone/daemons/daemon_configuration.h"

#include "base/text.h"
#include "standalone/core/error_number.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"

#include <algorithm>

namespace velt {

bool isRenderable(const std::filesystem::path& path) {
    const std::string text = path.string();
    return path.is_absolute() && text.size() <= 1024 && std::ranges::none_of(text, isControl) &&
           text.find_first_of("\"\\%*") == std::string::npos;
}

Result<> runConfigurationTest(const std::string& label, const std::vector<std::string>& arguments) {
    const auto result = runProcess(arguments);
    if (result.exitCode == 0) {
        return {};
    }
    std::string words = lastWords(result.errors);
    if (words.empty()) {
        words = "it ended with status " + std::to_string(result.exitCode);
    }
    return Error(ErrorNumber::daemon, "The " + label + " daemon refuses its configuration: " + words + ".");
}

} // namespace velt
