// What a login would see, and why, without a login.
#ifndef VELT_STANDALONE_LOGIN_VIEW_REPORT_H
#define VELT_STANDALONE_LOGIN_VIEW_REPORT_H

#include "standalone/login/path_rights.h"
#include "standalone/login/view_decision.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// A folder of the server, as the login sees it.
struct SeenFolder {
    std::string path;             ///< in the session: "/", "/docs"
    std::filesystem::path folder; ///< on the server
    Access access = Access::none; ///< by rules and grants; the file system may allow less in it
    std::vector<std::string> reasons;
    std::vector<Restriction> within; ///< folders in it that are shown with less
};

struct UnseenShare {
    std::string share;
    std::vector<std::string> reasons;
};

struct ViewReport {
    std::string refused;              ///< why the login would be refused; "" when it is not
    bool isWholeServer = false;       ///< not confined at all; `folders` is empty then
    std::vector<std::string> reasons; ///< for the kind of view
    std::vector<SeenFolder> folders;
    std::vector<UnseenShare> unseen; ///< where shares are shown side by side
    std::vector<std::string> remarks;
    std::filesystem::path home; ///< of the login, without links; "" where there is none
};

/// Decides as a login now would. For processes of one thread that run as root.
ViewReport reportView(const Login& login);

/// What the login sees of one file or folder.
struct SeenPath {
    std::string path; ///< in the session; "" when it cannot be reached there
    Access access = Access::none;
    std::string reason; ///< one sentence
};

SeenPath findInView(const ViewReport& view, const PathRights& rights);

} // namespace velt

#endif
