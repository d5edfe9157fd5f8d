#include "standalone/contract/last_error.h"

#include <string_view>
#include <utility>

namespace velt {

namespace {

struct LastError {
    ErrorNumber number = ErrorNumber::none;
    std::string sentence;
    SourcePlace where;
};

LastError& lastError() {
    thread_local LastError error;
    return error;
}

// The result points into the string literal that the compiler made for the place, so it never goes away.
const char* bareFileName(const char* path) {
    const std::string_view name(path);
    const auto slash = name.rfind('/');
    return slash == std::string_view::npos ? path : path + slash + 1;
}

} // namespace

int fail(ErrorNumber number, std::string sentence, SourcePlace where) {
    LastError& error = lastError();
    error.number = number;
    error.sentence = std::move(sentence);
    error.where = {bareFileName(where.file), where.line};
    return -1;
}

int fail(const Error& error) {
    return fail(error.number == ErrorNumber::none ? ErrorNumber::store : error.number, error.message,
                error.where);
}

ErrorNumber lastErrorNumber() {
    return lastError().number;
}

SourcePlace lastErrorPlace() {
    return lastError().where;
}

const std::string& lastErrorSentence() {
    return lastError().sentence;
}

void clearLastError() {
    lastError() = LastError();
}

} // namespace velt
