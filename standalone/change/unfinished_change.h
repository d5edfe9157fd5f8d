// The note by which a change that was cut off half-way is undone.
#ifndef VELT_STANDALONE_CHANGE_UNFINISHED_CHANGE_H
#define VELT_STANDALONE_CHANGE_UNFINISHED_CHANGE_H

#include "base/result.h"
#include "standalone/core/staged_files.h"

#include <vector>

namespace velt {

/// Writes down what the files were, durably. To be called before the first of them is stored.
Result<> noteChange(const std::vector<StagedFile>& files);

/// The change is done, or undone.
Result<> forgetChange();

/// The files of a note that is still there, as noteChange got them but for `after`; none without a note. One
/// that cannot be read is an error.
Result<std::vector<StagedFile>> unfinishedChange();

} // namespace velt

#endif
