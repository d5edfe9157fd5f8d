// Whole files as texts.
#ifndef VELT_HOST_BASE_FILE_TEXT_H
#define VELT_HOST_BASE_FILE_TEXT_H

#include <filesystem>
#include <optional>
#include <string>

namespace velt::host {

/// Nothing, with errno set, when it cannot be read.
std::optional<std::string> readFileText(const std::filesystem::path& file);

} // namespace velt::host

#endif
