// The description of the API, and what it can tell about parameters that a module refused.
#ifndef VELT_HOST_API_OPENAPI_H
#define VELT_HOST_API_OPENAPI_H

#include "host/api/problem.h"
#include "host/api/route.h"
#include "host/module/module_table.h"

#include <json/value.h>

#include <memory>
#include <string>
#include <vector>

namespace velt::host {

/// Constant once made; safe to use from any thread.
class OpenApi {
public:
    /// Reads the document that was built in. Throws std::runtime_error when it is no such document.
    OpenApi();
    ~OpenApi();
    OpenApi(const OpenApi&) = delete;
    OpenApi& operator=(const OpenApi&) = delete;

    /// The document's text.
    const std::string& text() const { return text_; }

    /// Whether the document describes the row's parameters.
    bool describes(const Row& row) const;

    /// The fields that break the description of the row's parameters, and what it expects of each. Only
    /// explains: whether a request is accepted is the module's to say.
    std::vector<FieldError> explain(const Row& row, const Json::Value& parameters) const;

private:
    struct Schemas;

    std::string text_;
    Json::Value document_;
    std::unique_ptr<Schemas> schemas_;
};

/// GET /openapi.json. The description outlives the route.
Route openApiRoute(const OpenApi& openApi);

} // namespace velt::host

#endif
