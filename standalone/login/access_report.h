// Asking what the logins of an account would see.
#ifndef VELT_STANDALONE_LOGIN_ACCESS_REPORT_H
#define VELT_STANDALONE_LOGIN_ACCESS_REPORT_H

#include "base/result.h"

#include <string>

namespace velt {

/// What logins of this user would see now, and why, as JSON (docs/api.md, /api/access). With a `path`, which
/// is absolute, also what they could do with that file or folder of the server; "" for none. The error is
/// ErrorNumber::notFound for a user that there is not. Decided by the code that makes the view of a login, in
/// a process of its own, which sees the folders as the services do. Thread-safe.
Result<std::string> reportAccess(const std::string& user, const std::string& path);

} // namespace velt

#endif
