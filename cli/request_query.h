// The query of a request's path.
#ifndef VELT_CLI_REQUEST_QUERY_H
#define VELT_CLI_REQUEST_QUERY_H

#include <string>

namespace velt::cli {

class RequestQuery {
public:
    /// Adds a parameter, encoded; not one without a value.
    void add(const char* name, const std::string& value);

    /// "?user=anna&limit=5"; "" without any.
    const std::string& text() const { return text_; }

private:
    std::string text_;
};

} // namespace velt::cli

#endif
