// System log lines. Each starts with the bare name of the source file and the line that wrote it, so the
// macros stand where the reason is known: never in a header, a loop over a table, or a helper of the base
// class.
#ifndef VELT_HANDLER_LOG_H
#define VELT_HANDLER_LOG_H

#include "platform/core.h"

#include <syslog.h>

#include <array>
#include <cstddef>
#include <string_view>

namespace velt {

/// The name of a source file without folder and extension, NUL-terminated.
constexpr std::array<char, 32> sourceName(std::string_view path) {
    const std::size_t slash = path.rfind('/');
    const std::string_view file = slash == std::string_view::npos ? path : path.substr(slash + 1);
    const std::string_view stem = file.substr(0, file.rfind('.'));
    std::array<char, 32> name{};
    for (std::size_t i = 0; i < stem.size(); ++i) {
        name.at(i) = stem[i];
    }
    return name;
}

} // namespace velt

/// Writes one line: a literal format without the leading "%s:%d ", and its arguments.
#define VELT_LOG(format, ...)                                                                                \
    do {                                                                                                     \
        static constexpr auto veltSource = ::velt::sourceName(__FILE__);                                     \
        ::syslog(LOG_ERR, "%s:%d " format, veltSource.data(), __LINE__ __VA_OPT__(, ) __VA_ARGS__);          \
    } while (false)

/// The same for a format that ends in "[0x%04X %s:%d]", which the core library's last error fills.
#define VELT_LOG_LAST_ERROR(format, ...)                                                                     \
    do {                                                                                                     \
        const int veltNumber = ::VLIBCErrGet();                                                              \
        const char* const veltFile = ::VLIBCErrorGetFile();                                                  \
        const int veltLine = ::VLIBCErrorGetLine();                                                          \
        VELT_LOG(format, __VA_ARGS__ __VA_OPT__(, ) static_cast<unsigned>(veltNumber), veltFile, veltLine);  \
    } while (false)

/// How a worker fails: writes the line, records the code with the handler, and is false.
#define VELT_FAIL(handler, code, ...)                                                                        \
    [&] {                                                                                                    \
        VELT_LOG(__VA_ARGS__);                                                                               \
        (handler).SetError(code);                                                                            \
        return false;                                                                                        \
    }()

/// The same with the core library's last error.
#define VELT_FAIL_LAST_ERROR(handler, code, ...)                                                             \
    [&] {                                                                                                    \
        VELT_LOG_LAST_ERROR(__VA_ARGS__);                                                                    \
        (handler).SetError(code);                                                                            \
        return false;                                                                                        \
    }()

#endif
