// The answer to a call of a module.
#ifndef VELT_HOST_API_ROW_ANSWER_H
#define VELT_HOST_API_ROW_ANSWER_H

#include "host/api/openapi.h"
#include "host/http/message.h"
#include "host/module/module_call.h"

#include <string>

namespace velt::host {

/// 200 with the value, or 204; else a problem with the module's code, a detail that an administrator can act
/// on, and for refused parameters the fields that do not match their schema.
HttpResponse answerFor(const Row& row, const Json::Value& parameters, const Outcome& outcome,
                       const OpenApi& openApi, const std::string& requestId);

/// The same refusal for a part of the settings document: it names the field of the section that is at fault,
/// by a JSON Pointer.
HttpResponse sectionRefusal(const std::string& section, const Row& row, const Json::Value& parameters,
                            const Outcome& outcome, const OpenApi& openApi, const std::string& requestId);

} // namespace velt::host

#endif
