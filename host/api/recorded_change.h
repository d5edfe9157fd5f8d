// What the history keeps of a change, field by field.
#ifndef VELT_HOST_API_RECORDED_CHANGE_H
#define VELT_HOST_API_RECORDED_CHANGE_H

#include "host/api/settings_document.h"
#include "standalone/standalone.h"

#include <json/value.h>

#include <string>
#include <vector>

namespace velt::host {

/// The fields of the change, each {"field", "from", "to"}; a list in any case.
Json::Value fieldsOf(const ChangeRecord& change);

/// The same.
std::vector<FieldChange> changesOf(const ChangeRecord& change);

/// The place of a JSON Pointer with one or two names, which is all that changes have.
Json::Value& placeIn(Json::Value& document, const std::string& pointer);

} // namespace velt::host

#endif
