#include "standalone/firewall/loaded_rules.h"

#include "base/file.h"
#include "base/sha256.h"
#include "base/text.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/firewall/ruleset_generation.h"
#include "standalone/process/process_identity.h"

#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <filesystem>
#include <string>

namespace velt {
namespace {

std::filesystem::path noteFile() {
    return statePath(paths::loadedRules);
}

/// The network whose rules are meant: each has generations of its own.
std::string networkId() {
    struct stat network {};
    return ::stat("/proc/self/ns/net", &network) == 0 ? std::to_string(network.st_ino) : "";
}

std::string note(std::uint32_t generation, std::string_view script) {
    return bootId() + "\n" + networkId() + " " + std::to_string(generation) + "\n" + std::string(script);
}

/// Stands before what the table of this script looked like in this network.
std::string listingHead(std::string_view script) {
    return bootId() + " " + networkId() + " " + sha256(script) + "\n";
}

} // namespace

Result<bool> rulesWereLoaded() {
    VELT_ASSIGN_OR_RETURN(const auto text, readOptionalFile(noteFile()));
    return text && text->substr(0, text->find('\n')) == bootId();
}

bool rulesAreInForce(std::string_view script) {
    const auto generation = rulesetGeneration();
    return generation && readFile(noteFile()) == note(*generation, script);
}

Result<> noteLoading() {
    return replaceFile(noteFile(), bootId(), 0644);
}

void noteLoaded(std::string_view script, std::optional<std::uint32_t> before) {
    const auto now = rulesetGeneration();
    if (!before || !now || *now != *before + 1) {
        return; // keep the note
    }
    if (const auto noted = replaceFile(noteFile(), note(*now, script), 0644); !noted) {
        ::syslog(LOG_WARNING, "%s", noted.error().message.c_str());
    }
}

void noteChanged(std::optional<std::uint32_t> before) {
    const auto text = readFile(noteFile());
    std::string_view script = text ? std::string_view(*text) : std::string_view();
    cut(script, '\n');
    cut(script, '\n');
    if (before && text && *text == note(*before, script)) {
        noteLoaded(script, before);
    }
}

void noteListing(std::string_view script, const std::string& print) {
    if (print.empty() || !rulesAreInForce(script)) {
        return;
    }
    const std::string text = listingHead(script) + print;
    if (const auto noted = replaceFile(statePath(paths::listedRules), text, 0644); !noted) {
        ::syslog(LOG_WARNING, "%s", noted.error().message.c_str());
    }
}

std::string listingAfterLoading(std::string_view script) {
    const auto text = readFile(statePath(paths::listedRules));
    const std::string head = listingHead(script);
    return text && text->starts_with(head) ? text->substr(head.size()) : "";
}

void noteRemoved() {
    ::unlink(noteFile().c_str());
    ::unlink(statePath(paths::listedRules).c_str());
}

} // namespace velt
