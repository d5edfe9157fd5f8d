// What sessions wrote down, one of which somebody may have taken over.
#include "standalone/activity/spool_text.h"

#include "fuzz/target.h"
#include "standalone/activity/record_line.h"

#include <array>

namespace {

using velt::fuzz::check;

const std::string good =
    "\x1e{\"kind\":\"upload\",\"result\":\"done\",\"protocol\":\"ftp\",\"session\":\"good\","
    "\"time\":1,\"number\":1}\n";

bool isGood(const velt::OperationRecord& record) {
    return record.session == "good" && record.number == 1;
}

/// What a session writes of any name is one record.
void checkWriting(const std::string& name) {
    const std::array<velt_member, 6> members{{{"kind", "delete", 0},
                                              {"result", "done", 0},
                                              {"protocol", "sftp", 0},
                                              {"path", name.c_str(), 0},
                                              {"time", nullptr, 1},
                                              {"number", nullptr, 1}}};
    std::array<char, velt_longest_line> line{};
    const std::size_t length = velt_make_line(line.data(), members.data(), members.size(), velt_longest_text);
    const auto read = velt::parseSpool({line.data(), length});
    check(read.records.size() == 1 && read.damaged == 0 && read.taken == length, "a name makes one record");
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text = velt::fuzz::textOf(data, size);
    const auto alone = velt::parseSpool(text);
    check(alone.taken <= text.size(), "no more is taken than is there");
    check(alone.records.size() + alone.damaged <= 2 * text.size(), "each line is counted once");
    for (const auto& record : alone.records) {
        check(record.time.time_since_epoch().count() >= 0, "no time is before the clock's");
    }

    // In two parts, as a reader that comes between two writings finds it.
    const auto rest = velt::parseSpool(std::string_view(text).substr(alone.taken));
    check(rest.taken == 0 && rest.records.empty() && rest.damaged == 0, "what is left is the begun line");

    const auto around = velt::parseSpool(good + text + "\n" + good);
    check(around.records.size() >= 2 && isGood(around.records.front()) && isGood(around.records.back()),
          "a damaged line takes no other with it");
    checkWriting(text);
    return 0;
}
