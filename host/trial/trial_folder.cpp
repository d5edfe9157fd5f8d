#include "host/trial/trial_folder.h"

#include "base/file.h"
#include "base/json_value.h"
#include "host/base/account_names.h"
#include "host/base/json.h"
#include "host/trial/trial_error.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

namespace velt::host {

namespace {

constexpr const char* recordFile = "trial.json";
constexpr const char* lockFile = "start.lock";

} // namespace

TrialFolder TrialFolder::forStart(const std::filesystem::path& folder) {
    check(makeFolder(folder));
    return {folder, false};
}

TrialFolder TrialFolder::forStop(const std::filesystem::path& folder) {
    return {folder, true};
}

TrialFolder::TrialFolder(const std::filesystem::path& folder, bool forStop)
    : name_((folder / "").string()), path_(std::filesystem::absolute(folder).lexically_normal()) {
    if (!path_.has_filename()) {
        path_ = path_.parent_path();
    }
    if (::chdir(path_.c_str()) != 0) {
        throw TrialError(cannot("enter", name_));
    }
    // Read-only, so that another user's can be opened, too.
    lock_ = UniqueFd(::open(lockFile, O_RDONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0644));
    struct stat status {};
    if (!lock_ || ::fstat(lock_.get(), &status) != 0) {
        throw TrialError(cannot("open", name_ + lockFile));
    }
    if (status.st_uid != ::geteuid() && !(forStop && ::geteuid() == 0)) {
        const std::string owner = userName(status.st_uid);
        throw TrialError(name_ + " belongs to the user \"" + owner + "\". " +
                         (forStop ? "Stop it as that user, or as root."
                                  : "Start as that user, or stop the trial and remove " + name_ + "."));
    }
    if (::flock(lock_.get(), LOCK_EX) != 0) {
        throw TrialError(cannot("lock", name_ + lockFile));
    }
}

TrialRecord TrialFolder::record() const {
    const auto text = valueOf(readOptionalFile(recordFile));
    if (!text) {
        return {};
    }
    const auto object = parseObject(*text);
    if (!object || !(*object)["place"].isString() || !(*object)["http_port"].isInt() ||
        !(*object)["build"].isString()) {
        throw TrialError(name_ + recordFile + " is damaged. Stop the trial and remove " + name_ + ".");
    }
    return {(*object)["place"].asString(), (*object)["http_port"].asInt(), (*object)["build"].asString()};
}

void TrialFolder::store(const TrialRecord& record) const {
    const Json::Value object = jsonObject(
        {{"place", record.place.string()}, {"http_port", record.httpPort}, {"build", record.build}});
    check(replaceFile(recordFile, toJson(object) + "\n", 0644));
}

} // namespace velt::host
