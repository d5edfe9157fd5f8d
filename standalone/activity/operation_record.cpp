#include "standalone/activity/operation_record.h"

#include <algorithm>
#include <array>

namespace velt {
namespace {

constexpr std::array<std::string_view, 3> protocols{"ftp", "ftps", "sftp"};
constexpr std::array<std::string_view, 3> results{"done", "incomplete", "refused"};
constexpr std::array<std::string_view, 14> operations{
    "login-refused", "session-opened", "session-closed", "upload", "download", "delete", "rename",
    "make-folder",   "remove-folder",  "mode",           "owner",  "times",    "link",   "truncate"};

/// The names are in the order of the enumeration.
template<class Value, class Names> std::string_view nameIn(const Names& names, Value value) {
    return names.at(static_cast<std::size_t>(value));
}

template<class Value, class Names> std::optional<Value> valueIn(const Names& names, std::string_view name) {
    const auto found = std::ranges::find(names, name);
    return found == names.end() ? std::nullopt : std::optional(static_cast<Value>(found - std::begin(names)));
}

} // namespace

std::string_view protocolName(SessionProtocol protocol) {
    return nameIn(protocols, protocol);
}

std::optional<SessionProtocol> protocolNamed(std::string_view name) {
    return valueIn<SessionProtocol>(protocols, name);
}

std::string_view operationName(Operation operation) {
    return nameIn(operations, operation);
}

std::optional<Operation> operationNamed(std::string_view name) {
    return valueIn<Operation>(operations, name);
}

std::string_view operationResultName(OperationResult result) {
    return nameIn(results, result);
}

std::optional<OperationResult> operationResultNamed(std::string_view name) {
    return valueIn<OperationResult>(results, name);
}

} // namespace velt
