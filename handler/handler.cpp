#include "handler/handler.h"

#include "handler/log.h"

ServiceHandler::ServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response)
    : ServiceHandler(request, response, 1) {}

ServiceHandler::ServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response, int version)
    : request_(request), response_(response), version_(version), errorCode_(ErrorCode::none) {}

void ServiceHandler::SetError(int code) {
    if (errorCode_ == ErrorCode::none) {
        errorCode_ = code;
    }
}

void ServiceHandler::ReportError() {
    Json::Value noData;
    ReportError(noData);
}

void ServiceHandler::ReportError(Json::Value& data) {
    if (errorCode_ == ErrorCode::none) {
        VELT_LOG("There is no error setup");
        errorCode_ = ErrorCode::operationFailed;
    }
    response_->SetError(errorCode_, data);
}

void ServiceHandler::ReportSuccess() {
    response_->SetSuccess(Json::Value());
}

void ServiceHandler::ReportSuccess(const Json::Value& data) {
    response_->SetSuccess(data);
}

Json::Value ServiceHandler::fetchParams() {
    return request_->GetParam("", Json::Value());
}
