#include "standalone/keys/public_key.h"

#include "base/plain_text.h"
#include "base/text.h"
#include "standalone/core/error_number.h"
#include "standalone/keys/key_blob.h"

namespace velt {
namespace {

constexpr std::string_view form = "one line \"TYPE BASE64 COMMENT\", such as a file id_ed25519.pub has";

Error expected(std::string what) {
    return {ErrorNumber::invalid, std::move(what)};
}

/// Cuts the text before the next blank off, and the blanks behind it.
std::string_view takeWord(std::string_view& rest) {
    const std::size_t end = std::min(rest.find_first_of(" \t"), rest.size());
    const std::string_view word = rest.substr(0, end);
    rest = trimmed(rest.substr(end));
    return word;
}

/// Why a type that is not known here is refused.
Error refusedType(std::string_view type) {
    if (type == "ssh-dss") {
        return expected("a key of another type than DSA, which is not safe");
    }
    if (type.find("-cert-v0") != std::string_view::npos) {
        return expected("the public key itself and no certificate");
    }
    return expected("a key of the type ssh-ed25519, ecdsa-sha2-nistp256, -nistp384, -nistp521 or ssh-rsa, or "
                    "of a security key");
}

bool isTypeWord(std::string_view word) {
    return isKeyType(word) || word == "ssh-dss" || word.find("-cert-v0") != std::string_view::npos;
}

} // namespace

Result<PublicKey> parsePublicKey(std::string_view line) {
    line = trimmed(line);
    if (line.size() > longestKeyLine) {
        return expected("a line of at most " + std::to_string(longestKeyLine) + " bytes");
    }
    const auto first = lengthOfOptions(line);
    if (line.empty() || line.front() == '#' || !isPlainText(line.substr(0, first.value_or(0))) || !first) {
        return expected(std::string(form));
    }
    PublicKey key;
    std::string_view rest = line;
    if (!isTypeWord(line.substr(0, *first)) && line.find_first_of(" \t") != std::string_view::npos) {
        VELT_ASSIGN_OR_RETURN(key.options, parseKeyOptions(line.substr(0, *first)));
        rest = trimmed(line.substr(*first));
    }
    key.type = takeWord(rest);
    if (!isKeyType(key.type)) {
        return refusedType(key.type);
    }
    key.base64 = takeWord(rest);
    const auto blob = decodedBase64(key.base64);
    VELT_ASSIGN_OR_RETURN(key.bits, checkKeyBlob(key.type, blob.value_or("")));
    if (!isPlainText(rest)) {
        return expected("a comment of plain text in UTF-8");
    }
    key.comment = rest;
    key.fingerprint = fingerprintOf(*blob);
    return key;
}

std::string toText(const PublicKey& key) {
    const std::string options = toText(key.options);
    return options + (options.empty() ? "" : " ") + key.type + ' ' + key.base64 +
           (key.comment.empty() ? "" : " ") + key.comment;
}

std::string lineForDaemon(const PublicKey& key) {
    const std::string options = toText(key.options);
    // Without the comment, which means nothing to the daemon.
    return "restrict" + (options.empty() ? "" : "," + options) + ' ' + key.type + ' ' + key.base64 + '\n';
}

} // namespace velt
