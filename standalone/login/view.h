// What becomes of the decision what a login may see: mounts for a session, or a report for an administrator.
#ifndef VELT_STANDALONE_LOGIN_VIEW_H
#define VELT_STANDALONE_LOGIN_VIEW_H

#include "base/result.h"
#include "standalone/login/view_mounts.h"
#include "standalone/shares/share_entry.h"

#include <string>

namespace velt {

/// Is told one folder, or of the shares side by side: beginShares, then each share once, then finishShares.
/// After an error nothing may be shown.
class View {
public:
    View() = default;
    virtual ~View() = default;
    View(const View&) = delete;
    View& operator=(const View&) = delete;

    virtual Result<> showHome(VisibleFolder home) = 0;
    /// The folder of the share, or one below it.
    virtual Result<> showInShare(const ShareEntry& share, VisibleFolder folder) = 0;

    virtual Result<> beginShares() = 0;
    /// An error means that this share alone is not shown.
    virtual Result<> addShare(const ShareEntry& share, VisibleFolder folder) = 0;
    /// A share that is not offered, or of which the user may see nothing.
    virtual void leaveOut(const ShareEntry& share) = 0;
    virtual Result<> finishShares() = 0;
};

} // namespace velt

#endif
