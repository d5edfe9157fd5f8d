// The web API framework: requests and responses.

#include "platform/webapi.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/text.h"

using fake::arguments;
using fake::Platform;

namespace VELT {

Json::Value APIRequest::GetParam(const std::string& name, const Json::Value& defaultValue) {
    if (Platform::instance().enter("APIRequest::GetParam", arguments(name, defaultValue))) {
        return defaultValue;
    }
    const Json::Value& params = static_cast<fake::Request*>(this)->params;
    return name.empty() ? params : params.get(name, defaultValue);
}

void APIResponse::SetSuccess(const Json::Value& data) {
    if (!Platform::instance().enter("APIResponse::SetSuccess", arguments(data))) {
        static_cast<fake::Response*>(this)->answers.push_back({true, 0, data});
    }
}

void APIResponse::SetError(int code, const Json::Value& data) {
    if (!Platform::instance().enter("APIResponse::SetError", arguments(code, data))) {
        static_cast<fake::Response*>(this)->answers.push_back({false, code, data});
    }
}

} // namespace VELT
