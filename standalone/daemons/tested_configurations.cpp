#include "standalone/daemons/tested_configurations.h"

#include <sys/stat.h>

#include <algorithm>
#include <cstddef>
#include <deque>
#include <mutex>

namespace velt {
namespace {

// A change puts its configuration to the test some times in a row: before it is stored, before the running
// daemon gives way, and before the next one starts.
constexpr std::size_t mostKept = 16;

struct Passed {
    std::mutex mutex;
    std::deque<std::string> hashes;
};

Passed& passed() {
    static Passed instance;
    return instance;
}

bool hasPassed(const std::string& hash) {
    const std::lock_guard lock(passed().mutex);
    const auto& hashes = passed().hashes;
    return std::ranges::find(hashes, hash) != hashes.end();
}

void note(const std::string& hash) {
    const std::lock_guard lock(passed().mutex);
    passed().hashes.push_back(hash);
    if (passed().hashes.size() > mostKept) {
        passed().hashes.pop_front();
    }
}

} // namespace

std::string identityOf(const std::vector<std::filesystem::path>& files) {
    std::string identity;
    for (const auto& file : files) {
        struct stat facts {};
        identity += file.string();
        if (::stat(file.c_str(), &facts) == 0) {
            for (const auto number :
                 {static_cast<long long>(facts.st_dev), static_cast<long long>(facts.st_ino),
                  static_cast<long long>(facts.st_size), static_cast<long long>(facts.st_mode),
                  static_cast<long long>(facts.st_mtim.tv_sec),
                  static_cast<long long>(facts.st_mtim.tv_nsec)}) {
                identity += ' ' + std::to_string(number);
            }
        }
        identity += '\n';
    }
    return identity;
}

Result<> testOnce(const std::string& hash, const std::function<Result<>()>& test) {
    if (hasPassed(hash)) {
        return {};
    }
    auto result = test();
    if (result) {
        note(hash);
    }
    return result;
}

} // namespace velt
