#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/unfinished_change.h"
#include "standalone/health/checks.h"
#include "standalone/health/mends.h"

namespace velt {

Findings changeFindings() {
    if (!changeWasLeft()) {
        return {};
    }
    if (!unfinishedChange()) {
        const std::string note = placeBelowRoot(paths::unfinishedChange).string();
        return {{"change-note-damaged", Severity::error, "settings",
                 "The note of a change that was left half-way, " + note + ", is damaged.",
                 "Check the settings, then run: rm " + note}};
    }
    return {{"change-half-undone", Severity::error, "settings",
             "A change failed and could be taken back only in part: settings and services may be those of "
             "before in one place, and the new ones in another.",
             restartOfHost()}};
}

} // namespace velt
