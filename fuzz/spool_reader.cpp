// Taking over a spool to which somebody may have written anything: the reader gets to its end, and to what is
// written later.
#include "standalone/activity/spool_reader.h"

#include "base/file.h"
#include "fuzz/target.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "tests/support/temporary_folder.h"

#include <filesystem>
#include <fstream>

namespace {
namespace fs = std::filesystem;

using velt::fuzz::check;

constexpr velt::SpoolReader::Sizes sizes{20000, 1 << 20};

std::string goodLine(long number) {
    return "\n\x1e{\"kind\":\"upload\",\"result\":\"done\",\"protocol\":\"ftp\",\"session\":\"good\","
           "\"time\":1,"
           "\"number\":" +
           std::to_string(number) + "}\n";
}

/// Whether it comes to an end, and has this record.
bool takes(velt::SpoolReader& reader, long number) {
    bool found = false;
    for (int parts = 0; parts < 100; ++parts) {
        const auto taken = reader.take();
        check(static_cast<bool>(taken), "what is in a spool is no failure");
        for (const auto& record : taken->records) {
            found = found || (record.session == "good" && record.number == number);
        }
        if (!taken->more) {
            return found;
        }
    }
    check(false, "a spool is taken over to its end");
    return false;
}

std::unique_ptr<velt::OperationStore> openStore() {
    const fs::path file = velt::statePath(velt::paths::operationDatabase);
    fs::remove_all(file.parent_path());
    fs::create_directories(file.parent_path());
    auto store = velt::OperationStore::open(file);
    check(static_cast<bool>(store), "a store is opened");
    return std::move(*store);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const velt::test::TemporaryFolder root;
    static std::unique_ptr<velt::OperationStore> store;
    static long count = 0;
    velt::setStateRoot(root.path());
    if (count++ % 1000 == 0) {
        store.reset();
        store = openStore();
    }
    const fs::path folder = velt::statePath(velt::paths::spools);
    const fs::path spool = folder / "spool";
    // Also over the borders of the parts that are read at once.
    const std::string text = velt::fuzz::textOf(data, size);
    const std::string padding(size > 0 ? data[0] % 4 * 8000U : 0, 'x');
    fs::remove_all(folder);
    fs::create_directories(folder);
    std::ofstream(spool) << padding << text << padding << text;
    velt::SpoolReader reader(folder, *store, sizes);
    takes(reader, -1);
    std::ofstream(spool, std::ios::app) << goodLine(count);
    check(takes(reader, count), "what comes after it is taken over");
    std::ofstream(spool, std::ios::app) << text;
    fs::rename(spool, folder / "spool.1");
    takes(reader, -1);
    takes(reader, -1);
    check(fs::is_empty(folder), "a spool that nobody has is removed");
    return 0;
}
