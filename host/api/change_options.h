// How a change is to be made, as the query of the request says.
#ifndef VELT_HOST_API_CHANGE_OPTIONS_H
#define VELT_HOST_API_CHANGE_OPTIONS_H

#include "host/api/problem.h"
#include "standalone/standalone.h"

#include <chrono>
#include <optional>
#include <string>
#include <variant>

namespace velt::host {

struct ChangeOptions {
    bool dryRun = false; ///< only say what it would do
    SessionPolicy sessions = SessionPolicy::byChange;
    std::optional<std::chrono::seconds> confirmWithin; ///< else it is taken back
};

/// Reads "dry_run=true&sessions=keep&confirm_within=60"; what is not there keeps its default. Or the
/// parameter that is wrong.
std::variant<ChangeOptions, FieldError> parseChangeOptions(const std::string& query);

/// The same for a change that knows no other option than "dry_run": whether it is one.
std::variant<bool, FieldError> parseDryRun(const std::string& query);

} // namespace velt::host

#endif
