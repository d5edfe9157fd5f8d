#include "standalone/activity/ended_session.h"

#include "base/unique_fd.h"
#include "standalone/activity/operation_record.h"
#include "standalone/activity/record_line.h"
#include "standalone/activity/session_activity.h"
#include "standalone/activity/spool.h"
#include "standalone/core/state_root.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <cstring>
#include <string>
#include <vector>

namespace velt {
namespace {

/// A field may have lost its end.
template<std::size_t Size> std::string whole(const char (&field)[Size]) {
    return {field, ::strnlen(field, Size)};
}

/// What the page says, as far as it can be: it may hold anything.
std::int64_t timeIn(std::int64_t microseconds) {
    return std::chrono::floor<std::chrono::microseconds>(pageTime(microseconds).time_since_epoch()).count();
}

std::int64_t between(std::int64_t begin, std::int64_t end) {
    return std::max<std::int64_t>(timeIn(end) - timeIn(begin), 0);
}

class EndedSession {
public:
    EndedSession(const SessionName& name, const velt_session_page& page)
        : name_(name), page_(page), spool_(velt_open_spool(statePath("/").c_str())), user_(whole(page.user)),
          account_(whole(page.account)), address_(whole(page.address)) {}

    bool record() {
        if (!spool_) {
            return false;
        }
        return (page_.transfer == velt_no_transfer || recordTransfer()) && recordEnd();
    }

private:
    bool write(std::uint32_t number, const std::vector<velt_member>& own);
    bool recordTransfer();
    bool recordEnd();
    std::string reason() const;

    const SessionName& name_;
    const velt_session_page& page_;
    UniqueFd spool_;
    std::string user_;
    std::string account_;
    std::string address_;
};

bool EndedSession::write(std::uint32_t number, const std::vector<velt_member>& own) {
    const auto protocol = static_cast<SessionProtocol>(std::min<std::uint32_t>(page_.protocol, velt_sftp));
    // When it ended, nobody knows; it was there at its last activity.
    std::vector<velt_member> members{
        {"time", nullptr, timeIn(page_.active)},
        {"session", name_.text.c_str(), 0},
        {"number", nullptr, number},
        {"protocol", protocolName(protocol).data(), 0},
        {"user", user_.c_str(), 0},
        {"account", account_.c_str(), 0},
        {"address", address_.c_str(), 0},
    };
    members.insert(members.end(), own.begin(), own.end());
    std::array<char, velt_longest_line> line{};
    const std::size_t length = velt_make_line(line.data(), members.data(), members.size(), velt_longest_text);
    return velt_write_spool(spool_.get(), line.data(), length) == 0;
}

bool EndedSession::recordTransfer() {
    const std::string path = whole(page_.transfer_path);
    const std::string server = whole(page_.transfer_server);
    const std::string share = whole(page_.transfer_share);
    const std::string within =
        share.empty() ? "" : server.substr(std::min<std::size_t>(page_.transfer_within, server.size()));
    return write(page_.transfer_record,
                 {{"kind", page_.transfer == velt_upload ? "upload" : "download", 0},
                  {"result", "incomplete", 0},
                  {"reason", "the session ended", 0},
                  {"path", path.c_str(), 0},
                  {"server", server.c_str(), 0},
                  {"share", share.c_str(), 0},
                  {"within", within.c_str(), 0},
                  {"octets", nullptr, static_cast<std::int64_t>(page_.transfer_octets)},
                  {"duration", nullptr, between(page_.transfer_since, page_.active)}});
}

std::string EndedSession::reason() const {
    const std::string by = whole(page_.ended_by);
    const std::string why = whole(page_.end_reason);
    return by.empty() ? "its process was killed" : "ended by " + by + (why.empty() ? "" : ": " + why);
}

bool EndedSession::recordEnd() {
    const std::string why = reason();
    const std::uint64_t in = page_.transfer == velt_upload ? page_.transfer_octets : 0;
    const std::uint64_t out = page_.transfer == velt_download ? page_.transfer_octets : 0;
    return write(velt_closing_record,
                 {{"kind", "session-closed", 0},
                  {"result", "done", 0},
                  {"reason", why.c_str(), 0},
                  {"in", nullptr, static_cast<std::int64_t>(page_.octets_in + in)},
                  {"out", nullptr, static_cast<std::int64_t>(page_.octets_out + out)},
                  {"duration", nullptr, between(page_.since, page_.active)},
                  {"leftout", nullptr, page_.left_out > 0 ? std::int64_t{page_.left_out} : -1}});
}

} // namespace

bool recordEndedSession(const SessionName& name, const velt_session_page& page) {
    return velt_may_record(statePath("/").c_str()) == 0 || EndedSession(name, page).record();
}

} // namespace velt
