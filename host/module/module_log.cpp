#include "host/module/module_log.h"

#include <algorithm>
#include <cctype>
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
    while (!text.empty() && text.back() == '\n') {
        text.pop_back();
    }
    return text;
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
    const std::size_t space = line.find(' ');
    const std::size_t colon = line.find(':');
    if (space == std::string::npos || colon > space || colon + 1 == space) {
        return line;
    }
    const bool number = std::all_of(line.begin() + static_cast<std::ptrdiff_t>(colon) + 1,
                                    line.begin() + static_cast<std::ptrdiff_t>(space),
                                    [](unsigned char c) { return std::isdigit(c) != 0; });
    return number ? line.substr(space + 1) : line;
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
