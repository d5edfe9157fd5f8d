#include "tests/system/support/module_host.h"

#include "platform/webapi.h"
#include "standalone/standalone.h"

#include <dlfcn.h>

#include <stdexcept>

namespace velt::test {
namespace {

class TestRequest : public VELT::APIRequest {
public:
    explicit TestRequest(const Json::Value& parameters) : parameters_(parameters) {}
    const Json::Value& parameters() const { return parameters_; }

private:
    const Json::Value& parameters_;
};

class TestResponse : public VELT::APIResponse {
public:
    void answer(int code, const Json::Value& data) {
        answer_.code = answered_ ? -1 : code;
        answer_.data = data;
        answered_ = true;
    }
    const ModuleAnswer& given() const { return answer_; }

private:
    ModuleAnswer answer_;
    bool answered_ = false;
};

const VELT::APITableRow* loadModule() {
    void* module = dlopen(VELT_BUILT_FOLDER "/VELT.Core.FileServ.FTP.so", RTLD_NOW | RTLD_LOCAL);
    void* symbol = module == nullptr ? nullptr : dlsym(module, "GetAPITable");
    if (symbol == nullptr) {
        throw std::runtime_error(dlerror());
    }
    return reinterpret_cast<const VELT::APITableRow* (*)()>(symbol)();
}

VELT::APIEntryFunction entryOf(const std::string& api, int version, const std::string& method) {
    static const VELT::APITableRow* const table = loadModule();
    for (const VELT::APITableRow* row = table; row->api != nullptr; ++row) {
        if (row->api == api && row->version == version && row->method == method) {
            return row->entry;
        }
    }
    throw std::runtime_error("the module does not serve " + api + " " + method);
}

} // namespace

ModuleAnswer requestModule(const std::string& api, int version, const std::string& method,
                           const Json::Value& parameters) {
    const VELT::APIEntryFunction entry = entryOf(api, version, method);
    TestRequest request(parameters);
    TestResponse response;
    setRequestActor(requestActorName, requestActorAddress);
    clearLastError();
    entry(&request, &response);
    ModuleAnswer answer = response.given();
    answer.sentence = lastErrorSentence();
    return answer;
}

} // namespace velt::test

Json::Value VELT::APIRequest::GetParam(const std::string& name, const Json::Value& defaultValue) {
    const Json::Value& parameters = static_cast<velt::test::TestRequest*>(this)->parameters();
    return name.empty() ? parameters : parameters.get(name, defaultValue);
}

void VELT::APIResponse::SetSuccess(const Json::Value& data) {
    static_cast<velt::test::TestResponse*>(this)->answer(0, data);
}

void VELT::APIResponse::SetError(int code, const Json::Value& data) {
    static_cast<velt::test::TestResponse*>(this)->answer(code, data);
}
