#include "cli/command.h"

#include "cli/json_io.h"

#include <CLI/CLI.hpp>

namespace velt::cli {

bool Context::wroteJson(const Json::Value& value) const {
    if (json) {
        writeJson(console.out, value);
    }
    return json;
}

void onWords(CLI::App* words, Command& chosen, const Command& command) {
    words->callback([&chosen, command] { chosen = command; });
}

} // namespace velt::cli
