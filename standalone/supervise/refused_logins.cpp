#include "standalone/supervise/refused_logins.h"

#include "base/text.h"

namespace velt {
namespace {

constexpr std::chrono::minutes quiet{1};

/// "'USER' refused: REASON"
std::optional<RefusedLogin> parse(std::string_view text) {
    constexpr std::string_view between = "' refused: ";
    const std::size_t at = text.find(between);
    if (!text.starts_with('\'') || at == std::string_view::npos) {
        return std::nullopt;
    }
    return RefusedLogin{std::string(text.substr(1, at - 1)), std::string(text.substr(at + between.size()))};
}

std::optional<RefusedLogin> parseAfter(std::string_view words, std::string_view message) {
    message = trimmedEnd(message, "\r\n");
    return message.starts_with(words) ? parse(message.substr(words.size())) : std::nullopt;
}

} // namespace

std::optional<RefusedLogin> refusedFtpLogin(std::string_view message) {
    // What a session writes begins with the client's address in brackets, as a number.
    constexpr std::string_view endOfHead = "]): ";
    const std::size_t head = message.find(endOfHead);
    return head == std::string_view::npos
               ? std::nullopt
               : parseAfter("mod_velt_login/2.0: login of ", message.substr(head + endOfHead.size()));
}

std::optional<RefusedLogin> refusedSftpLogin(std::string_view message) {
    return parseAfter("velt-sftp-session: login of ", message);
}

bool ReasonsOfLate::isNew(const std::string& reason, Clock::time_point now) {
    std::erase_if(let_, [&](const auto& each) { return now - each.second >= quiet; });
    return let_.emplace(reason, now).second;
}

} // namespace velt
