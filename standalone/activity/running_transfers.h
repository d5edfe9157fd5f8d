// What the pages of the sessions tell over time: transfers that begin and go on, and how much has been moved.
#ifndef VELT_STANDALONE_ACTIVITY_RUNNING_TRANSFERS_H
#define VELT_STANDALONE_ACTIVITY_RUNNING_TRANSFERS_H

#include "standalone/activity/activity_reader.h"
#include "standalone/activity/session_pages.h"

#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace velt {

/// Not thread-safe.
class RunningTransfers {
public:
    /// Looks at all pages. Gives what is to be told of their transfers.
    std::vector<Activity> look();

    /// A session has ended, with these octets altogether.
    void ended(const OperationRecord& record);

    /// Of all sessions that were seen, also of those that have ended.
    const std::map<SessionProtocol, std::uint64_t>& sessions() const { return sessions_; }
    std::map<SessionProtocol, MovedOctets> octets() const;

private:
    struct Seen {
        SessionProtocol protocol = SessionProtocol::ftp;
        MovedOctets octets;
        std::uint32_t transfer = 0; ///< the number of its record; 0: none
        std::uint64_t transferOctets = 0;
        int looksAgo = 0; ///< since its page was seen
    };

    void forgetLost();
    void see(const SessionName& name, const velt_session_page& page, std::vector<Activity>& told);

    std::map<std::string, Seen> seen_;
    std::map<SessionProtocol, std::uint64_t> sessions_;
    std::map<SessionProtocol, MovedOctets> ended_;
};

/// The protocol that a page says.
SessionProtocol protocolOf(const velt_session_page& page);

} // namespace velt

#endif
