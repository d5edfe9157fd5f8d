// The page of a session that somebody may have taken over: it can be shown, and it ends with its session.
#include "standalone/activity/session_pages.h"

#include "base/file.h"
#include "base/unique_fd.h"
#include "base/utf8.h"
#include "fuzz/target.h"
#include "standalone/activity/running_transfers.h"
#include "standalone/activity/spool_text.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "tests/support/temporary_folder.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cstring>
#include <filesystem>
#include <fstream>

namespace {
namespace fs = std::filesystem;

using velt::fuzz::check;

const std::string session = "1z4-8rd2k-0f3a9c21";

bool isUtf8(std::string_view text) {
    while (!text.empty()) {
        const std::size_t length = velt::firstUtf8Character(text).length;
        if (length == 0) {
            return false;
        }
        text.remove_prefix(length);
    }
    return true;
}

void checkTexts(const velt_session_page& page) {
    for (const std::string& text :
         {velt::fieldText(page.user), velt::fieldText(page.account), velt::fieldText(page.address),
          velt::fieldText(page.command), velt::fieldText(page.path), velt::fieldText(page.security),
          velt::fieldText(page.transfer_path), velt::fieldText(page.transfer_server)}) {
        check(isUtf8(text), "texts are UTF-8");
    }
    check(velt::pageTime(page.active) >= velt::pageTime(INT64_MIN), "times can be shown");
}

/// What is left of it in the spool.
void checkEnd(const velt_session_page& page) {
    const auto text = velt::readFile(velt::statePath(velt::paths::spools) / "spool");
    const bool isTold = page.form == velt_page_form && page.closed == 0;
    check(static_cast<bool>(text) == isTold, "the end of a session is recorded unless it has done so");
    if (isTold) {
        const auto read = velt::parseSpool(*text);
        check(read.damaged == 0 && read.taken == text->size(), "its records are whole");
        check(read.records.size() == (page.transfer == velt_no_transfer ? 1U : 2U) &&
                  read.records.back().operation == velt::Operation::sessionClosed &&
                  read.records.back().session == session,
              "its end is the last of them");
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const velt::test::TemporaryFolder root;
    static velt::RunningTransfers transfers;
    velt::setStateRoot(root.path());
    velt::parseSessionName(velt::fuzz::textOf(data, size));

    velt_session_page page{};
    std::memcpy(&page, data, std::min(size, sizeof page));
    const fs::path folder = velt::statePath(velt::paths::sessions);
    const fs::path file = folder / session;
    fs::remove_all(velt::statePath(velt::paths::spools));
    fs::create_directories(folder);
    std::ofstream(file, std::ios::binary) << std::string(reinterpret_cast<const char*>(&page), sizeof page)
                                          << std::string(velt_page_size - sizeof page, '\0');

    const auto visit = [](const velt::SessionName& name, const velt_session_page& shown) {
        check(name.text == session, "a page has its session's name");
        checkTexts(shown);
    };
    {
        const velt::UniqueFd held(::open(file.c_str(), O_RDWR | O_CLOEXEC));
        check(::flock(held.get(), LOCK_EX | LOCK_NB) == 0, "the session lives");
        check(static_cast<bool>(velt::visitSessionPages(visit)), "a page is no failure");
        transfers.look();
        check(fs::exists(file), "a page stays as long as its session");
    }
    check(static_cast<bool>(velt::visitSessionPages(visit)), "nor is one that nobody has");
    check(!fs::exists(file), "a page goes with its session");
    checkEnd(page);
    return 0;
}
