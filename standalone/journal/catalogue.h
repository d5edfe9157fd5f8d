// The catalogue of the administrator log: a sentence for each event number.
#ifndef VELT_STANDALONE_JOURNAL_CATALOGUE_H
#define VELT_STANDALONE_JOURNAL_CATALOGUE_H

#include <array>
#include <cstdint>
#include <span>
#include <string>

namespace velt {

struct CatalogueEntry {
    std::uint32_t event;
    const char* sentence; ///< with %1 to %4 where the texts belong
};

/// Every event that the catalogue knows, by number.
std::span<const CatalogueEntry> catalogue();

/// The event's sentence with the texts in their places. What the texts contain is never looked at, not even
/// when it looks like a place. An event without a sentence is named by its number, with the texts behind it.
std::string sentenceOf(std::uint32_t event, const std::array<std::string, 4>& texts);

} // namespace velt

#endif
