// Whether a settings document can be what is stored next.
#ifndef VELT_HOST_API_DOCUMENT_CHECK_H
#define VELT_HOST_API_DOCUMENT_CHECK_H

#include "host/api/problem.h"

#include <json/value.h>

#include <vector>

namespace velt::host {

/// The document with the patch applied (JSON Merge Patch, RFC 7396), where a setting that the patch takes
/// away has its default afterwards.
Json::Value patched(const Json::Value& document, const Json::Value& patch);

/// Everything in `wanted` that cannot be, by JSON Pointers: what is unknown, missing, of another type, out of
/// its range, or at odds with another setting. A value that `current` has already is not judged. Accounts and
/// shares are for the module to look up.
std::vector<FieldError> checkSettings(const Json::Value& wanted, const Json::Value& current);

} // namespace velt::host

#endif
