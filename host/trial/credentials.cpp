#include "host/trial/credentials.h"

#include "base/file.h"
#include "base/number_text.h"
#include "base/text.h"
#include "host/api/token_store.h"
#include "host/trial/trial_error.h"

#include <unistd.h>

#include <cstdlib>

namespace velt::host {

namespace {

constexpr const char* tokenName = "token";
constexpr const char* tokenUse = "quick-start";
constexpr const char* environmentName = "env";

/// The text as one word of a shell.
std::string quoted(const std::string& text) {
    std::string word = "'";
    for (const char c : text) {
        word += c == '\'' ? "'\\''" : std::string(1, c);
    }
    return word + "'";
}

void giveToCaller() {
    const char* const user = std::getenv("SUDO_UID"); // NOLINT(concurrency-mt-unsafe)
    const auto id = parseNumber(user == nullptr ? "" : user);
    if (!id || ::geteuid() != 0) {
        return;
    }
    for (const char* name : {".", environmentName, tokenName}) {
        if (::lchown(name, static_cast<uid_t>(*id), static_cast<gid_t>(-1)) != 0) {
            throw TrialError(std::string("Cannot give the file ") + name + " to the user who called sudo.");
        }
    }
}

} // namespace

std::optional<std::string> storedToken() {
    const auto text = valueOf(readOptionalFile(tokenName)).value_or("");
    const std::string token(trimmedEnd(text, "\n"));
    return TokenStore(tokenFileName).find(token) ? std::optional(token) : std::nullopt;
}

std::string makeToken() {
    TokenStore store(tokenFileName);
    for (const Token& lost : store.tokens()) {
        if (lost.name == tokenUse) {
            (void)store.remove(lost.id);
        }
    }
    std::string token = store.create(tokenUse, Role::admin).text;
    check(replaceFile(tokenName, token + "\n", 0600));
    return token;
}

void writeEnvironment(const std::string& url, const std::string& token,
                      const std::filesystem::path& programs) {
    const std::string folder = quoted(programs.string());
    check(replaceFile(environmentName,
                      "export VELT_URL=" + url + "\nexport VELT_TOKEN=" + token + "\ncase \":$PATH:\" in *:" +
                          folder + ":*) ;; *) export PATH=" + folder + ":$PATH ;; esac\n",
                      0600));
    giveToCaller();
}

} // namespace velt::host
