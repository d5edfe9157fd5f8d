// What a JSON schema says.
#ifndef VELT_HOST_API_JSON_SCHEMA_H
#define VELT_HOST_API_JSON_SCHEMA_H

#include <json/value.h>

#include <string>
#include <vector>

namespace velt::host {

/// `part` of the document with what each "$ref" names in its place, and with the schemas of each "allOf"
/// merged into one. References are to places in the document ("#/components/schemas/Token") and do not lead
/// back to themselves.
Json::Value flatSchema(const Json::Value& document, const Json::Value& part);

/// The schema with bounds in place of each "format" of a number, for a validator that knows bounds only.
Json::Value withBounds(Json::Value schema);

/// What the schema expects at the path of property names and array indices: "a number from 1 to 65535",
/// "true or false". "a different value" when the schema does not say.
std::string expectationOf(const Json::Value& schema, const std::vector<std::string>& path);

} // namespace velt::host

#endif
