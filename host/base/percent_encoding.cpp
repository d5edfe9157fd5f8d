#include "host/base/percent_encoding.h"

#include "base/utf8.h"

#include <algorithm>
#include <charconv>
#include <utility>

namespace velt::host {

namespace {

std::optional<char> byteOf(std::string_view digits) {
    unsigned value = 0;
    const char* const end = digits.data() + digits.size();
    const auto [stop, error] = std::from_chars(digits.data(), end, value, 16);
    const bool good = digits.size() == 2 && error == std::errc() && stop == end;
    return good ? std::optional(static_cast<char>(value)) : std::nullopt;
}

} // namespace

std::optional<std::string> percentDecoded(std::string_view text) {
    std::string decoded;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '%') {
            decoded += text[i];
            continue;
        }
        const auto byte = byteOf(text.substr(i + 1, 2));
        if (!byte) {
            return std::nullopt;
        }
        decoded += *byte;
        i += 2;
    }
    return findInvalidUtf8(decoded) == std::string::npos ? std::optional(decoded) : std::nullopt;
}

std::optional<std::vector<std::string>> pathSegments(std::string_view path) {
    std::vector<std::string> segments;
    // Split first: an encoded slash belongs to its segment.
    for (std::size_t begin = 1; begin <= path.size();) {
        const std::size_t end = std::min(path.find('/', begin), path.size());
        auto segment = percentDecoded(path.substr(begin, end - begin));
        if (!segment) {
            return std::nullopt;
        }
        segments.push_back(std::move(*segment));
        begin = end + 1;
    }
    return segments;
}

} // namespace velt::host
