// Mounting what one login may see.
#ifndef VELT_STANDALONE_LOGIN_LOGIN_VIEW_H
#define VELT_STANDALONE_LOGIN_LOGIN_VIEW_H

#include "base/result.h"
#include "standalone/login/view_decision.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// Makes `root`, an existing folder, show what the login may see. It mounts in this process's mount
/// namespace, which must belong to the session alone. Returns one sentence for each share that is left out or
/// gives less than it grants. What it shows is written to the standard output, for the session, see
/// shown_facts.h. After an error the login must be refused.
Result<std::vector<std::string>> makeLoginView(Login login, const std::filesystem::path& root);

} // namespace velt

#endif
