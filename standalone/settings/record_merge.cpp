#include "standalone/settings/record_merge.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <iterator>

namespace velt {
namespace {

using Record = _tag_VELT_FTP_CONF_;

constexpr std::array numbers{
    &Record::use_ext_ip,   &Record::enable_flow_ctrl, &Record::maxuploadrate,    &Record::maxdownloadrate,
    &Record::anonymous,    &Record::anonymous_chroot, &Record::passive_port_min, &Record::passive_port_max,
    &Record::support_utf8, &Record::max_conn_per_ip,  &Record::reserved,         &Record::enable_fxp,
    &Record::user_chroot,
};

// With the two texts and the service flags, no field is left out.
static_assert(sizeof(Record) == sizeof(Record::portnum) + sizeof(Record::anonymous_chroot_share) +
                                    sizeof(Record::service_flags) + numbers.size() * sizeof(std::int32_t));

template<class Value> void applyChange(Value& stored, const Value& seen, const Value& wanted) {
    if (wanted != seen) {
        stored = wanted;
    }
}

template<std::size_t size>
void applyChange(char (&stored)[size], const char (&seen)[size], const char (&wanted)[size]) {
    if (!std::equal(std::begin(wanted), std::end(wanted), std::begin(seen))) {
        std::copy(std::begin(wanted), std::end(wanted), std::begin(stored));
    }
}

} // namespace

_tag_VELT_FTP_CONF_ mergeRecord(const Record& stored, const Record& seen, const Record& wanted) {
    Record merged = stored;
    applyChange(merged.portnum, seen.portnum, wanted.portnum);
    applyChange(merged.anonymous_chroot_share, seen.anonymous_chroot_share, wanted.anonymous_chroot_share);
    for (const auto number : numbers) {
        applyChange(merged.*number, seen.*number, wanted.*number);
    }
    const std::int32_t changedBits = seen.service_flags ^ wanted.service_flags;
    merged.service_flags = (stored.service_flags & ~changedBits) | (wanted.service_flags & changedBits);
    return merged;
}

SftpSettings mergeRecord(const SftpSettings& stored, const SftpSettings& seen, const SftpSettings& wanted) {
    SftpSettings merged = stored;
    applyChange(merged.enabled, seen.enabled, wanted.enabled);
    applyChange(merged.port, seen.port, wanted.port);
    return merged;
}

} // namespace velt
