// JSON as text: what arrives in bodies and leaves in answers. Thread-safe; each thread has its own reader and
// writer.
#ifndef VELT_HOST_BASE_JSON_H
#define VELT_HOST_BASE_JSON_H

#include <json/value.h>

#include <string>
#include <string_view>

namespace velt::host {

struct ParsedObject {
    Json::Value value{Json::objectValue};
    std::string error; ///< "" when the text is one JSON object; else what is wrong and where
};

/// Reads one JSON object: UTF-8, no comments, no key twice. Text of blanks alone is the empty object.
ParsedObject parseObject(std::string_view text);

/// Compact JSON in one line, UTF-8 as it is. A byte that is no UTF-8, such as one of a file's name, becomes
/// the replacement character.
std::string toJson(const Json::Value& value);

/// The offset of the first byte that is no UTF-8, or npos.
std::size_t findInvalidUtf8(std::string_view text);

} // namespace velt::host

#endif
