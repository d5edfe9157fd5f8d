// The description of the API, which also explains why parameters were refused.
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

/// Constant, so thread-safe.
class OpenApi {
public:
    /// Reads the built-in document. Throws std::runtime_error when that is damaged.
    OpenApi();
    ~OpenApi();
    OpenApi(const OpenApi&) = delete;
    OpenApi& operator=(const OpenApi&) = delete;

    /// The document's text.
    const std::string& text() const { return text_; }

    /// The parameters that do not match the row's schema, and what it expects of each. This only explains:
    /// the module decides whether a request is accepted.
    std::vector<FieldError> explain(const Row& row, const Json::Value& parameters) const;

    /// Whether a parameter of the row is a list.
    bool takesLists(const Row& row) const;

private:
    struct Schemas;

    std::string text_;
    std::unique_ptr<Schemas> schemas_;
};

/// GET /openapi.json. The description outlives the route.
Route openApiRoute(const OpenApi& openApi);

} // namespace velt::host

#endif
