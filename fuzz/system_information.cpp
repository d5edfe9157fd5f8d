// The file of the system's information, which other programs write as well: the first line of the input is
// the value to be written, the rest the file.
#include "fuzz/target.h"
#include "standalone/core/key_value_file.h"
#include "tests/support/temporary_folder.h"

#include <algorithm>
#include <vector>

namespace {

constexpr const char* key = "ftp_ext_ip";

/// The lines that do not speak of the key.
std::vector<std::string> othersIn(const std::string& text) {
    std::vector<std::string> lines;
    std::size_t at = 0;
    while (at < text.size()) {
        const auto end = std::min(text.find('\n', at), text.size());
        const std::string line = text.substr(at, end - at);
        if (line.find(key) == std::string::npos) {
            lines.push_back(line);
        }
        at = end + 1;
    }
    return lines;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const velt::test::TemporaryFolder folder;
    const std::string input = velt::fuzz::textOf(data, size);
    const auto lineEnd = std::min(input.find('\n'), input.size());
    const std::string value = input.substr(0, lineEnd);
    const std::string before = lineEnd < input.size() ? input.substr(lineEnd + 1) : "";
    folder.write("info", before);
    if (velt::writeKeyValue(folder.path() / "info", key, value)) {
        const auto read = velt::readKeyValue(folder.path() / "info", key);
        velt::fuzz::check(read && *read == value, "what is written is read again");
        velt::fuzz::check(othersIn(folder.read("info")) == othersIn(before), "other lines stay");
    } else {
        velt::fuzz::check(folder.read("info") == before, "a refused value changes nothing");
    }
    return 0;
}
