#include "standalone/activity/running_transfers.h"

#include <algorithm>
#include <chrono>
#include <utility>

namespace velt {
namespace {

OperationRecord recordOf(const SessionName& name, const velt_session_page& page) {
    OperationRecord record;
    record.time = pageTime(page.active);
    record.operation = page.transfer == velt_upload ? Operation::upload : Operation::download;
    record.result = OperationResult::incomplete;
    record.session = name.text;
    record.number = page.transfer_record;
    record.protocol = protocolOf(page);
    record.user = fieldText(page.user);
    record.account = fieldText(page.account);
    record.address = fieldText(page.address);
    record.place.path = fieldText(page.transfer_path);
    record.place.serverPath = fieldText(page.transfer_server);
    record.place.share = fieldText(page.transfer_share);
    record.octets = page.transfer_octets;
    record.duration =
        std::chrono::floor<std::chrono::microseconds>(pageTime(page.active) - pageTime(page.transfer_since));
    return record;
}

MovedOctets octetsOf(const velt_session_page& page) {
    MovedOctets octets{page.octets_in, page.octets_out};
    octets.in += page.transfer == velt_upload ? page.transfer_octets : 0;
    octets.out += page.transfer == velt_download ? page.transfer_octets : 0;
    return octets;
}

} // namespace

SessionProtocol protocolOf(const velt_session_page& page) {
    return static_cast<SessionProtocol>(std::min<std::uint32_t>(page.protocol, velt_sftp));
}

void RunningTransfers::see(const SessionName& name, const velt_session_page& page,
                           std::vector<Activity>& told) {
    Seen& seen = seen_[name.text];
    seen.looksAgo = 0;
    seen.protocol = protocolOf(page);
    const MovedOctets octets = octetsOf(page);
    seen.octets = {std::max(seen.octets.in, octets.in), std::max(seen.octets.out, octets.out)};
    ++sessions_[seen.protocol];
    if (page.transfer != velt_upload && page.transfer != velt_download) {
        seen.transfer = 0;
        return;
    }
    const bool isNew = seen.transfer != page.transfer_record;
    if (isNew || seen.transferOctets != page.transfer_octets) {
        told.push_back({isNew ? ActivityKind::transferStarted : ActivityKind::transferProgress,
                        recordOf(name, page), page.rate});
    }
    seen.transfer = page.transfer_record;
    seen.transferOctets = page.transfer_octets;
}

std::vector<Activity> RunningTransfers::look() {
    std::vector<Activity> told;
    for (auto& [name, seen] : seen_) {
        ++seen.looksAgo;
    }
    sessions_.clear();
    // Where the pages cannot be read, there is nothing to tell; the next look may be luckier.
    static_cast<void>(visitSessionPages(
        [&](const SessionName& name, const velt_session_page& page) { see(name, page, told); }));
    forgetLost();
    return told;
}

/// Without a page a session's last word is in the spool. It may be lost.
void RunningTransfers::forgetLost() {
    constexpr int longest = 60;
    for (auto at = seen_.begin(); at != seen_.end();) {
        if (at->second.looksAgo < longest) {
            ++at;
            continue;
        }
        ended_[at->second.protocol].in += at->second.octets.in;
        ended_[at->second.protocol].out += at->second.octets.out;
        at = seen_.erase(at);
    }
}

void RunningTransfers::ended(const OperationRecord& record) {
    MovedOctets octets{record.octetsIn.value_or(0), record.octetsOut.value_or(0)};
    if (const auto found = seen_.find(record.session); found != seen_.end()) {
        octets = {std::max(octets.in, found->second.octets.in),
                  std::max(octets.out, found->second.octets.out)};
        seen_.erase(found);
    }
    ended_[record.protocol].in += octets.in;
    ended_[record.protocol].out += octets.out;
}

std::map<SessionProtocol, MovedOctets> RunningTransfers::octets() const {
    auto all = ended_;
    for (const auto& [name, seen] : seen_) {
        all[seen.protocol].in += seen.octets.in;
        all[seen.protocol].out += seen.octets.out;
    }
    return all;
}

} // namespace velt
