// Settings that several change at once.
//
// A record is handed over whole, though its caller meant to change a part of it. What the calling thread last
// saw of the record tells which part: only that is applied to what is stored by now, so that another's change
// of another part stays.
#ifndef VELT_STANDALONE_SETTINGS_RECORD_MERGE_H
#define VELT_STANDALONE_SETTINGS_RECORD_MERGE_H

#include "standalone/core/state_root.h"
#include "standalone/settings/settings.h"

#include <filesystem>
#include <optional>

namespace velt {

/// `stored` with the fields in which `wanted` differs from `seen`; of the service flags, the bits.
_tag_VELT_FTP_CONF_ mergeRecord(const _tag_VELT_FTP_CONF_& stored, const _tag_VELT_FTP_CONF_& seen,
                                const _tag_VELT_FTP_CONF_& wanted);
SftpSettings mergeRecord(const SftpSettings& stored, const SftpSettings& seen, const SftpSettings& wanted);

/// What one thread last read of a record, or last stored of its own. Belongs to that thread.
template<class Record> class LastSeen {
public:
    void note(const Record& record) {
        root_ = statePath("/");
        record_ = record;
    }
    void forget() { record_.reset(); }

    /// What to store when the thread wants `wanted`: all of it when it has seen nothing below this root.
    Record merge(const Record& stored, const Record& wanted) const {
        return record_ && root_ == statePath("/") ? mergeRecord(stored, *record_, wanted) : wanted;
    }

private:
    std::filesystem::path root_;
    std::optional<Record> record_;
};

} // namespace velt

#endif
