// Names the state of the settings that an answer shows, so that a client changes only what it has seen.
#ifndef VELT_HOST_API_REVISION_H
#define VELT_HOST_API_REVISION_H

#include <atomic>
#include <cstdint>
#include <string>

namespace velt::host {

/// Counts the changes since the start of the host. Thread-safe.
class Revision {
public:
    Revision();

    /// As an entity tag, with its quotes. Unique among all runs of the host.
    std::string tag() const;

    /// Something was changed.
    void advance() { ++count_; }

    /// Whether this If-Match allows the request: it is "", "*", or a list that contains the tag.
    bool allows(const std::string& ifMatch) const;

private:
    const std::string run_;
    std::atomic<std::uint64_t> count_{0};
};

} // namespace velt::host

#endif
