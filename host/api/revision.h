// Which state of the settings an answer tells of, so that a client can change only what it has seen.
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

    /// As an entity tag, in its quotes. No two runs of the host share one.
    std::string tag() const;

    /// Something was changed.
    void advance() { ++count_; }

    /// Whether a request with this If-Match may go on: "", "*", or a list that has the tag.
    bool allows(const std::string& ifMatch) const;

private:
    const std::string run_;
    std::atomic<std::uint64_t> count_{0};
};

} // namespace velt::host

#endif
