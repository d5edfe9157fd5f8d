// Which operations a request for /api/transfers means, and in which form it wants them.
#ifndef VELT_HOST_API_OPERATION_QUERY_H
#define VELT_HOST_API_OPERATION_QUERY_H

#include "host/api/problem.h"
#include "standalone/standalone.h"

#include <optional>
#include <string>
#include <variant>

namespace velt::host {

enum class OperationForm {
    json,
    jsonLines,
    csv,
};

struct OperationQuery {
    OperationFilter filter;
    OperationForm form = OperationForm::json;
};

/// Reads "user=anna&operation=upload,delete&format=csv". Without "format", `accept` tells the form: the first
/// of its media types that is known, whatever their weights. Or the parameter that is wrong.
std::variant<OperationQuery, FieldError> parseOperationQuery(const std::string& query,
                                                             const std::string& accept);

} // namespace velt::host

#endif
