// What a schema expects, in words.
#ifndef VELT_HOST_API_SCHEMA_WORDS_H
#define VELT_HOST_API_SCHEMA_WORDS_H

#include <json/value.h>

#include <string>
#include <vector>

namespace velt::host {

/// What the schema expects at the path of property names and array indices: "an integer from 1 to 65535",
/// "true or false". "a different value" when the schema does not say.
std::string expectationOf(const Json::Value& schema, const std::vector<std::string>& path);

} // namespace velt::host

#endif
