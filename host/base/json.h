// JSON in requests and answers. Thread-safe.
#ifndef VELT_HOST_BASE_JSON_H
#define VELT_HOST_BASE_JSON_H

#include "base/result.h"

#include <json/value.h>

#include <string>
#include <string_view>

namespace velt::host {

/// Reads one JSON object: UTF-8, no comments, no duplicate keys. Blank text is the empty object.
/// An error says what is wrong and where: "line 1, column 8: the text is not UTF-8".
Result<Json::Value> parseObject(std::string_view text);

/// Compact JSON in one line, UTF-8 as it is. A byte that is not UTF-8, such as one of a file's name, becomes
/// the replacement character.
std::string toJson(const Json::Value& value);

/// A member's name as a part of a JSON Pointer (RFC 6901).
std::string pointerToken(const std::string& name);

} // namespace velt::host

#endif
