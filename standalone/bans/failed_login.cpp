#include "standalone/bans/failed_login.h"

#include "base/number_text.h"
#include "base/text.h"

namespace velt {
namespace {

constexpr std::string_view from = " from ";

/// Takes what follows the last `separator` off the text. False when there is none.
bool takeLast(std::string_view& text, std::string_view separator, std::string_view& tail) {
    const std::size_t at = text.rfind(separator);
    if (at == std::string_view::npos) {
        return false;
    }
    tail = text.substr(at + separator.size());
    text = text.substr(0, at);
    return true;
}

struct Failure {
    std::string_view user;
    std::optional<IpNetwork> address;
};

/// " NAME from ADDRESS port NUMBER ssh2"
std::optional<Failure> refusedPassword(std::string_view text) {
    constexpr std::string_view end = " ssh2";
    if (!text.ends_with(end)) {
        return std::nullopt;
    }
    text.remove_suffix(end.size());
    std::string_view port;
    std::string_view address;
    const bool complete = takeLast(text, " port ", port) && takeLast(text, from, address);
    return complete && parseNumber(port) ? std::optional(Failure{text, parseIpAddress(address)})
                                         : std::nullopt;
}

/// " REASON for NAME from ADDRESS"
std::optional<Failure> refusedByPam(std::string_view text) {
    constexpr std::string_view before = " for ";
    std::string_view address;
    if (!takeLast(text, from, address)) {
        return std::nullopt;
    }
    const std::size_t name = text.find(before);
    return name == std::string_view::npos
               ? std::nullopt
               : std::optional(Failure{text.substr(name + before.size() - 1), parseIpAddress(address)});
}

std::optional<Failure> failureIn(std::string_view message) {
    constexpr std::string_view password = "Failed password for ";
    // The daemon writes of the keyboard-interactive method by itself only after some failures, and PAM
    // always.
    constexpr std::string_view pam = "PAM: ";
    message = trimmedEnd(message, "\r\n");
    if (message.starts_with(password)) {
        return refusedPassword(message.substr(password.size() - 1));
    }
    return message.starts_with(pam) ? refusedByPam(message.substr(pam.size() - 1)) : std::nullopt;
}

} // namespace

std::optional<IpNetwork> failedSftpLogin(std::string_view message) {
    const auto failure = failureIn(message);
    return failure ? failure->address : std::nullopt;
}

std::string userOfFailedSftpLogin(std::string_view message) {
    const auto failure = failureIn(message);
    if (!failure || !failure->address) {
        return "";
    }
    std::string_view user = failure->user;
    for (const std::string_view unknown : {" invalid user ", " illegal user "}) {
        if (user.starts_with(unknown)) {
            return std::string(user.substr(unknown.size()));
        }
    }
    return std::string(user.substr(user.empty() ? 0 : 1));
}

std::optional<IpNetwork> failedFtpLogin(std::string_view message) {
    // What a session writes begins with the client's address in brackets, as a number.
    constexpr std::string_view endOfHead = "]): ";
    constexpr std::string_view words = "mod_velt_login: password refused from ";
    message = trimmedEnd(message, "\r\n");
    const std::size_t head = message.find(endOfHead);
    if (head == std::string_view::npos) {
        return std::nullopt;
    }
    message.remove_prefix(head + endOfHead.size());
    return message.starts_with(words) ? parseIpAddress(message.substr(words.size())) : std::nullopt;
}

} // namespace velt
