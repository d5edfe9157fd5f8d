// Parameters that would not arrive as they were sent.
#ifndef VELT_HOST_API_PARAMETER_CHECK_H
#define VELT_HOST_API_PARAMETER_CHECK_H

#include "host/api/problem.h"
#include "host/module/module_table.h"

#include <json/value.h>

#include <optional>

namespace velt::host {

/// The first rule that is not an object, which the module could not look into. The first text, at any depth,
/// that contains U+0000: the platform takes only what is before it. And the first setting that is a text,
/// which is always one line, with a control character. Nothing when there is none; the module decides on all
/// else.
std::optional<FieldError> findUnfitParameter(const Row& row, const Json::Value& parameters);

} // namespace velt::host

#endif
