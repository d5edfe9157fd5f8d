// A module that breaks its contract in every way that a host must survive.

#include "platform/webapi.h"

#include <stdexcept>

namespace {

void noAnswer(VELT::APIRequest*, VELT::APIResponse*) {}

void twoAnswers(VELT::APIRequest*, VELT::APIResponse* response) {
    response->SetSuccess(Json::Value());
    response->SetError(1902, Json::Value());
}

void throwsException(VELT::APIRequest*, VELT::APIResponse*) {
    throw std::runtime_error("out of luck");
}

void throwsInt(VELT::APIRequest*, VELT::APIResponse* response) {
    response->SetSuccess(Json::Value());
    throw 7;
}

void unknownCode(VELT::APIRequest*, VELT::APIResponse* response) {
    response->SetError(4242, Json::Value());
}

void parameters(VELT::APIRequest* request, VELT::APIResponse* response) {
    Json::Value value(Json::objectValue);
    value["all"] = request->GetParam("", Json::Value());
    value["one"] = request->GetParam("one", "default");
    response->SetSuccess(value);
}

const VELT::APITableRow table[] = {
    {"VELT.Test.Rude", 1, "no_answer", noAnswer},
    {"VELT.Test.Rude", 1, "two_answers", twoAnswers},
    {"VELT.Test.Rude", 1, "throws_exception", throwsException},
    {"VELT.Test.Rude", 1, "throws_int", throwsInt},
    {"VELT.Test.Rude", 1, "unknown_code", unknownCode},
    {"VELT.Test.Rude", 1, "parameters", parameters},
    {nullptr, 0, nullptr, nullptr},
};

} // namespace

extern "C" __attribute__((visibility("default"))) const VELT::APITableRow* GetAPITable() {
    return table;
}
