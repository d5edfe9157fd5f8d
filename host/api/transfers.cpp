#include "host/api/transfers.h"

#include "base/json_value.h"
#include "host/api/operation_query.h"
#include "host/api/operation_text.h"
#include "host/api/problem.h"

#include <variant>

namespace velt::host {

namespace {

HttpResponse inForm(OperationForm form, const OperationPage& page) {
    switch (form) {
    case OperationForm::jsonLines:
        return {200, "application/x-ndjson", toJsonLines(page.records), {}};
    case OperationForm::csv:
        return {200, "text/csv; charset=utf-8; header=present", toCsv(page.records), {}};
    default:
        return jsonResponse(
            200, jsonObject({{"next", page.next ? Json::Value(keyText(*page.next)) : Json::Value()},
                             {"records", jsonArray(page.records, [](const OperationRecord& record) {
                                  return toObject(record);
                              })}}));
    }
}

/// The request's target with another "before".
std::string nextTarget(const HttpRequest& request, const OperationKey& key) {
    std::string target = request.path() + "?before=" + keyText(key);
    const std::string query = request.query();
    for (std::size_t begin = 0; begin < query.size();) {
        const std::size_t end = std::min(query.find('&', begin), query.size());
        const std::string parameter = query.substr(begin, end - begin);
        if (!parameter.empty() && parameter != "before" && !parameter.starts_with("before=")) {
            target += "&" + parameter;
        }
        begin = end + 1;
    }
    return target;
}

HttpResponse answer(const Call& call) {
    const auto parsed = parseOperationQuery(call.request.query(), call.request.accept);
    if (const auto* const bad = std::get_if<FieldError>(&parsed)) {
        return fieldProblem(400, *bad, "", call.id);
    }
    const auto& query = std::get<OperationQuery>(parsed);
    const auto page = searchOperations(query.filter);
    if (!page) {
        return problem(500, page.error().message, call.id);
    }
    HttpResponse response = inForm(query.form, *page);
    if (page->next) {
        response.headers.emplace_back("Link",
                                      "<" + nextTarget(call.request, *page->next) + ">; rel=\"next\"");
    }
    return response;
}

} // namespace

Route transferRoute() {
    return {"GET", {"api", "transfers"}, false, RequestOrder::Kind::search, answer};
}

} // namespace velt::host
