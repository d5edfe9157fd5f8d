#include "cli/request_query.h"

#include "cli/http_client.h"

namespace velt::cli {

void RequestQuery::add(const char* name, const std::string& value) {
    if (!value.empty()) {
        text_ += (text_.empty() ? "?" : "&") + std::string(name) + "=" + percentEncode(value);
    }
}

} // namespace velt::cli
