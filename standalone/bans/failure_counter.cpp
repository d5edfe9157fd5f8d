#include "standalone/bans/failure_counter.h"

#include <algorithm>

namespace velt {
namespace {

constexpr unsigned customerBits = 64;
constexpr IpNetwork linkLocal{{0xfe, 0x80}, 10};
constexpr IpNetwork loopback6{{0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 1}, 128};
constexpr IpNetwork loopback4{{0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0xff, 127}, 104};

} // namespace

IpNetwork sourceOf(const IpNetwork& address) {
    const bool counts = address.isIPv4() || linkLocal.contains(address) || address == loopback6;
    return counts ? address : widened(address, customerBits);
}

bool isSpared(const IpNetwork& source, const BanSettings& settings) {
    const auto overlaps = [&source](const IpNetwork& network) {
        return network.contains(source) || source.contains(network);
    };
    return overlaps(loopback4) || loopback6 == source || std::ranges::any_of(settings.never, overlaps);
}

bool FailureCounter::count(const IpNetwork& source, const BanSettings& settings, Clock::time_point now) {
    if (!failures_.contains(source.first)) {
        makeRoom();
    }
    std::deque<Clock::time_point>& times = failures_[source.first];
    times.push_back(now);
    while (now - times.front() >= settings.window) {
        times.pop_front();
    }
    if (times.size() < static_cast<std::size_t>(settings.failures)) {
        return false;
    }
    failures_.erase(source.first);
    return true;
}

void FailureCounter::makeRoom() {
    if (failures_.size() < mostSources) {
        return;
    }
    failures_.erase(
        std::ranges::min_element(failures_, {}, [](const auto& each) { return each.second.back(); }));
}

} // namespace velt
