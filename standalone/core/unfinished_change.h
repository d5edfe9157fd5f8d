// The note by which a change that was left half-way is undone.
#ifndef VELT_STANDALONE_CORE_UNFINISHED_CHANGE_H
#define VELT_STANDALONE_CORE_UNFINISHED_CHANGE_H

#include "base/result.h"
#include "standalone/core/staged_files.h"

#include <vector>

namespace velt {

/// Writes down what the files were, durably, in place of an older note. To be called before the first of them
/// is stored.
Result<> noteChange(const std::vector<StagedFile>& files);

/// The change is done, or undone.
Result<> forgetChange();

/// The files of a note that is still there, as noteChange got them but for `after`; none without a note. One
/// that cannot be read is an error.
Result<std::vector<StagedFile>> unfinishedChange();

/// While one lives, this process is at work on a change: its note is no sign of trouble.
class ChangeAtWork {
public:
    ChangeAtWork();
    ~ChangeAtWork();
    ChangeAtWork(const ChangeAtWork&) = delete;
    ChangeAtWork& operator=(const ChangeAtWork&) = delete;
};

/// The changes on which this process was at work so far. Thread-safe.
struct ChangeCount {
    unsigned begun = 0;
    unsigned atWork = 0; ///< and is now
};
ChangeCount changeCount();

/// Whether there is a note on which this process is not at work: of a change that could not be undone, or not
/// wholly. Thread-safe.
bool changeWasLeft();

} // namespace velt

#endif
