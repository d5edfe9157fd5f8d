// A JSON schema in one piece.
#ifndef VELT_HOST_API_FLAT_SCHEMA_H
#define VELT_HOST_API_FLAT_SCHEMA_H

#include <json/value.h>

namespace velt::host {

/// `part` of the document with what each "$ref" names in its place, and with the schemas of each "allOf"
/// merged into one. References are to places in the document ("#/components/schemas/Token") and do not lead
/// back to themselves.
Json::Value flatSchema(const Json::Value& document, const Json::Value& part);

} // namespace velt::host

#endif
