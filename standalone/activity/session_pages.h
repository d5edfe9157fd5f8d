// The pages of the sessions, as others read them.
#ifndef VELT_STANDALONE_ACTIVITY_SESSION_PAGES_H
#define VELT_STANDALONE_ACTIVITY_SESSION_PAGES_H

#include "base/result.h"
#include "standalone/activity/session_page.h"
#include "standalone/process/process_identity.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// A name that a session's page has, and the process which it means.
struct SessionName {
    std::string text;
    ProcessId process; ///< the first of the session's processes
    std::string boot;  ///< the beginning of the machine's boot id
};

/// Nothing for a text that is no name of a session.
std::optional<SessionName> parseSessionName(std::string_view text);

/// A field of a page as text: UTF-8, other octets as "%XX".
std::string pageText(std::string_view field);
template<std::size_t Size> std::string fieldText(const char (&field)[Size]) {
    return pageText(std::string_view(field, Size));
}

/// A time of a page; one that cannot be is brought into range.
std::chrono::system_clock::time_point pageTime(std::int64_t microseconds);

/// Shows the page of each session to `visit`. Those whose session has ended without a word are recorded in
/// the spool, what they were at and their end, and removed. Thread-safe.
Result<>
visitSessionPages(const std::function<void(const SessionName& name, const velt_session_page& page)>& visit);

/// Notes in the session's page who is about to end it, and why. False when there is no such page.
Result<bool> noteSessionEnd(const SessionName& name, const std::string& by, const std::string& reason);

} // namespace velt

#endif
