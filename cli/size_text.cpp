#include "cli/size_text.h"

#include <array>

namespace velt::cli {

std::string sizeText(std::uint64_t octets) {
    constexpr std::array<const char*, 7> units{" B", " KB", " MB", " GB", " TB", " PB", " EB"};
    constexpr std::uint64_t step = 1000;
    std::size_t unit = 0;
    std::uint64_t tenths = 0; // of the unit, rounded down
    while (octets >= step) {
        tenths = octets % step / 100;
        octets /= step;
        ++unit;
    }
    const bool needsTenths = unit > 0 && octets < 10;
    return std::to_string(octets) + (needsTenths ? "." + std::to_string(tenths) : "") + units.at(unit);
}

} // namespace velt::cli
