#include "standalone/settings/record_merge.h"

#include "standalone/settings/settings_fields.h"

#include <algorithm>

namespace velt {
namespace {

template<class Value> void applyChange(Value& stored, const Value& seen, const Value& wanted) {
    if (wanted != seen)
        stored = wanted;
}

void applyChange(std::span<char> stored, std::span<char> seen, std::span<char> wanted) {
    if (!std::equal(wanted.begin(), wanted.end(), seen.begin()))
        std::copy(wanted.begin(), wanted.end(), stored.begin());
}

template<class Settings>
Settings merge(const SettingsFile<Settings>& form, Settings stored, Settings seen, Settings wanted) {
    for (const auto& setting : form.settings)
        std::visit([&](const auto& field) { applyChange(field(stored), field(seen), field(wanted)); },
                   setting.field);
    return stored;
}

} // namespace

_tag_VELT_FTP_CONF_ mergeRecord(const _tag_VELT_FTP_CONF_& stored, const _tag_VELT_FTP_CONF_& seen,
                                const _tag_VELT_FTP_CONF_& wanted) {
    auto merged = merge<FtpSettings>(ftpSettingsFile(), {stored}, {seen}, {wanted}).record;
    const std::int32_t changedBits = seen.service_flags ^ wanted.service_flags;
    merged.service_flags = (stored.service_flags & ~changedBits) | (wanted.service_flags & changedBits);
    return merged;
}

SftpSettings mergeRecord(const SftpSettings& stored, const SftpSettings& seen, const SftpSettings& wanted) {
    return merge(sftpSettingsFile(), stored, seen, wanted);
}

} // namespace velt
