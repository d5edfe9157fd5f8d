// Texts that are shown, stored or sent: the functions that make them harmless.
#include "base/ipv4.h"
#include "base/plain_text.h"
#include "base/printable.h"
#include "base/text.h"
#include "base/utf8.h"
#include "fuzz/target.h"
#include "host/base/percent_encoding.h"
#include "standalone/ports/port_range.h"

#include <algorithm>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    using velt::fuzz::check;
    const std::string text = velt::fuzz::textOf(data, size);
    const std::string plain = velt::plainText(text, 40);
    check(plain.size() <= 40 && velt::isPlainText(plain), "plain text is plain and short");
    check(velt::findInvalidUtf8(plain) == std::string::npos, "plain text is UTF-8");
    check(!velt::isPlainText(text) || text.size() > 40 || plain == text, "plain text stays as it is");
    const std::string shown = velt::printable(text);
    check(std::ranges::none_of(shown, velt::isControl) && velt::printable(shown) == shown,
          "what is printed has no control characters");
    if (const auto address = velt::parseIPv4(text)) {
        check(velt::parseIPv4(velt::toText(*address)) == address, "an address can be read again");
    }
    if (const auto range = velt::parsePortRange(text)) {
        check(velt::formatPortRange(*range).size() <= text.size() + 6 && range->first <= range->last,
              "a range is one");
    }
    static_cast<void>(velt::host::percentDecoded(text));
    static_cast<void>(velt::host::pathSegments(text));
    return 0;
}
