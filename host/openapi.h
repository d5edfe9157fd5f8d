// The description of the API, and what it can tell about parameters that a module refused.
#ifndef VELT_HOST_OPENAPI_H
#define VELT_HOST_OPENAPI_H

#include "host/module_table.h"

#include <json/value.h>

#include <memory>
#include <string>
#include <vector>

namespace velt::host {

struct FieldError {
    std::string field;    ///< "portnum", "rules[2].name"
    std::string expected; ///< "an integer from 1 to 65535"
};

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

} // namespace velt::host

#endif
