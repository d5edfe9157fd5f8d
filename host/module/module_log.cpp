#include "host/module/module_log.h"

#include "base/text.h"

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <exception>

// Not from <syslog.h>, which defines syslog itself when fortified.
extern "C" {

void syslog(int priority, const char* format, ...) __attribute__((format(printf, 2, 3)));
void __syslog_chk(int priority, int flag, const char* format, ...) __attribute__((format(printf, 3, 4)));
void vsyslog(int priority, const char* format, va_list arguments) __attribute__((format(printf, 2, 0)));

} // extern "C"

namespace velt::host {

namespace {

thread_local ModuleLog* current = nullptr;

__attribute__((format(printf, 1, 0))) std::string rendered(const char* format, va_list arguments) {
    va_list forSize;
    va_copy(forSize, arguments);
    const int size = std::vsnprintf(nullptr, 0, format, forSize);
    va_end(forSize);
    std::string text(static_cast<std::size_t>(std::max(size, 0)) + 1, '\0');
    std::vsnprintf(text.data(), text.size(), format, arguments);
    text.pop_back();
    return std::string(trimmedEnd(text, "\n"));
}

__attribute__((format(printf, 2, 0))) void write(int priority, const char* format, va_list arguments) {
    // "%m" stands for the text of errno, in both copies of the line.
    const int error = errno;
    if (current != nullptr) {
        va_list copy;
        va_copy(copy, arguments);
        try {
            current->add(rendered(format, copy));
        } catch (const std::exception&) {
            // Out of memory: the line still reaches the system log.
        }
        va_end(copy);
    }
    errno = error;
    vsyslog(priority, format, arguments);
    errno = error;
}

/// What follows "source:line " at the start of a line.
std::string withoutSource(const std::string& line) {
    std::string_view rest = line;
    std::string_view place = cut(rest, ' ');
    cut(place, ':');
    const bool isLine =
        !rest.empty() && place.find_first_not_of("0123456789") == std::string_view::npos && !place.empty();
    return isLine ? std::string(rest) : line;
}

} // namespace

ModuleLog::ModuleLog() : outer_(current) {
    current = this;
}

ModuleLog::~ModuleLog() {
    current = outer_;
}

std::string reasonIn(const std::vector<std::string>& lines) {
    for (auto line = lines.rbegin(); line != lines.rend(); ++line) {
        std::string reason = withoutSource(*line);
        if (!reason.starts_with("Request: ")) {
            return reason;
        }
    }
    return "";
}

} // namespace velt::host

extern "C" {

void syslog(int priority, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    velt::host::write(priority, format, arguments);
    va_end(arguments);
}

void __syslog_chk(int priority, int, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    velt::host::write(priority, format, arguments);
    va_end(arguments);
}

} // extern "C"
