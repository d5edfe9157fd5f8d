// What a key may be restricted to: the options before it in a line of an authorized_keys file (sshd(8)).
#ifndef VELT_STANDALONE_KEYS_KEY_OPTIONS_H
#define VELT_STANDALONE_KEYS_KEY_OPTIONS_H

#include "base/result.h"

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

struct KeyOptions {
    std::string from; ///< addresses, networks and patterns of addresses, separated by commas; "": anywhere
    std::optional<std::chrono::system_clock::time_point> expires; ///< from when on it opens nothing

    bool operator==(const KeyOptions&) const = default;
};

/// Reads `from="192.0.2.0/24,!192.0.2.7",expiry-time="20271231"`. A time without a Z at its end is of this
/// server's time zone. Names of hosts are refused, since the SFTP daemon looks none up, and so is any other
/// option: what a login with a key may do is the same for all keys. An error says what was expected, to stand
/// behind "expected". Thread-safe.
Result<KeyOptions> parseKeyOptions(std::string_view text);

/// The same with the time in UTC, in the form that is read again; "" without any.
std::string toText(const KeyOptions& options);

/// The length of what stands before the first blank that is not within quotes; nothing when a quote is not
/// closed.
std::optional<std::size_t> lengthOfOptions(std::string_view line);

} // namespace velt

#endif
