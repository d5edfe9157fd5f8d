#include "host/module/api_messages.h"

#include <utility>

namespace velt::host {

Request::Request(Json::Value parameters) : parameters_(std::move(parameters)) {}

void Response::answer(bool success, int code, const Json::Value& data) {
    if (++answers_ == 1) {
        success_ = success;
        code_ = code;
        data_ = data;
    }
}

} // namespace velt::host

// Only this host makes the requests and responses of this process, so the casts below hold.
namespace VELT {

Json::Value APIRequest::GetParam(const std::string& name, const Json::Value& defaultValue) {
    const Json::Value& parameters = static_cast<const velt::host::Request*>(this)->parameters();
    return name.empty() ? parameters : parameters.get(name, defaultValue);
}

void APIResponse::SetSuccess(const Json::Value& data) {
    static_cast<velt::host::Response*>(this)->answer(true, 0, data);
}

void APIResponse::SetError(int code, const Json::Value& data) {
    static_cast<velt::host::Response*>(this)->answer(false, code, data);
}

} // namespace VELT
