// The framework's side: the request and the response that an entry function is called with.
#ifndef VELT_HOST_MODULE_API_MESSAGES_H
#define VELT_HOST_MODULE_API_MESSAGES_H

#include "platform/webapi.h"

#include <json/value.h>

namespace velt::host {

/// A request with its parameters.
class Request final : public VELT::APIRequest {
public:
    /// `parameters` is a JSON object.
    explicit Request(Json::Value parameters);

    const Json::Value& parameters() const { return parameters_; }

private:
    Json::Value parameters_;
};

/// A response. Keeps the first answer, and counts them all.
class Response final : public VELT::APIResponse {
public:
    int answers() const { return answers_; }
    bool success() const { return success_; }
    int code() const { return code_; }
    const Json::Value& data() const { return data_; }

    void answer(bool success, int code, const Json::Value& data);

private:
    int answers_ = 0;
    bool success_ = false;
    int code_ = 0;
    Json::Value data_;
};

} // namespace velt::host

#endif
