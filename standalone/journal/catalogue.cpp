#include "standalone/journal/catalogue.h"

#include <algorithm>
#include <cstdio>
#include <string_view>

namespace velt {

namespace {

constexpr std::array<CatalogueEntry, 40> entries{{
    {0x11B00002, "The FTP service was enabled."},
    {0x11B00006, "The FTP service was disabled."},
    {0x11B00008, "The FTP upload limit was changed from %1 to %2."},
    {0x11B00009, "The FTP download limit was changed from %1 to %2."},
    {0x11B0000A, "The passive port range of the FTP service was changed from %1 to %2."},
    {0x11B00010, "Anonymous FTP login was allowed."},
    {0x11B00011, "Anonymous FTP login was forbidden."},
    {0x11B00012, "The FTP port was changed from %1 to %2."},
    // Written last when the service comes up, after the settings that it came up with.
    {0x11B00013, "The FTP service was started."},
    // "Enabled" when plain FTP alone was the choice before, "Disabled" when it is from now on.
    {0x11B00019, "FTP with encryption (FTPS) was set to \"%1\"."},
    {0x11B00020, "Announcing the external address in passive mode was set to \"%1\"."},
    {0x11B00021, "UTF-8 file names in the FTP service were set to \"%1\"."},
    {0x11B00022, "The limit of FTP connections from one address was set to \"%1\"."},
    {0x11B00024, "User \"%1\" was confined to the home folder in the FTP service."},
    // Written also for users who had no rule, or have another one.
    {0x11B00025,
     "User \"%1\" is not among those whom a rule confines to the home folder in the FTP service."},
    {0x11B00026, "Confining anonymous FTP users to one share was %1."},
    {0x11B00027, "Confining FTP users to their home folders was set to \"%1\"."},
    {0x11B00028, "The share that anonymous FTP users are confined to was set to \"%1\"."},
    {0x11B00035, "The SFTP port was changed from %1 to %2."},
    {0x11B00036, "The SFTP service was enabled."},
    // This system's own, far from those of the modules.
    {0x11BF0001, "Logins from %1 are refused for %2 seconds after %3 failed ones at %4."},
    {0x11BF0002, "The ban of %1 was lifted."},
    {0x11BF0003, "The settings were changed (%1): %2."},
    {0x11BF0004, "The change %1 was not confirmed in time and was taken back%2."},
    {0x11BF0005, "The change %1 was confirmed."},
    {0x11BF0006, "A token with the role %2 was made for \"%1\"; its id is %3."},
    {0x11BF0007, "The token %3 with the role %2, made for \"%1\", was deleted."},
    {0x11BF0008, "A restart was asked for (%1): %2."},
    {0x11BF0009, "The change of the settings (%1) failed and could be taken back only in part: %2."},
    {0x11BF000A,
     "The change %1 was not confirmed in time, but nothing was taken back: %2 changed again since."},
    {0x11BF000B, "The session %1 of \"%2\" from %3 was ended%4."},
    {0x11BF0010, "The %1 service ended unexpectedly: %2."},
    {0x11BF0011, "The %1 service runs again."},
    {0x11BF0012, "The %1 service was started by another program."},
    {0x11BF0013, "The %1 service was stopped by another program."},
    {0x11BF0014, "The %1 service is on, but could not be started: %2."},
    {0x11BF0015, "The administrator log begins here: its former file was moved away or deleted."},
    {0x11BF0016, "A login of \"%2\" over %1 was refused: %3."},
    {0x11BF0020, "The key %2 (%3) was added for \"%1\"."},
    {0x11BF0021, "The key %2 (%3) of \"%1\" was removed."},
}};

std::string unknownSentence(std::uint32_t event, const std::array<std::string, 4>& texts) {
    char number[16];
    std::snprintf(number, sizeof number, "0x%08X", event);
    std::string sentence = std::string("Event ") + number;
    const char* separator = ": ";
    for (const std::string& text : texts) {
        if (text.empty()) {
            continue;
        }
        sentence += separator + text;
        separator = ", ";
    }
    return sentence + ".";
}

} // namespace

std::span<const CatalogueEntry> catalogue() {
    return entries;
}

std::string sentenceOf(std::uint32_t event, const std::array<std::string, 4>& texts) {
    const auto* const known =
        std::find_if(entries.begin(), entries.end(),
                     [event](const CatalogueEntry& entry) { return entry.event == event; });
    if (known == entries.end()) {
        return unknownSentence(event, texts);
    }
    std::string sentence;
    std::string_view rest = known->sentence;
    while (!rest.empty()) {
        if (rest.size() >= 2 && rest[0] == '%' && rest[1] >= '1' && rest[1] <= '4') {
            sentence += texts[static_cast<std::size_t>(rest[1] - '1')];
            rest.remove_prefix(2);
        } else {
            sentence += rest[0];
            rest.remove_prefix(1);
        }
    }
    return sentence;
}

} // namespace velt
