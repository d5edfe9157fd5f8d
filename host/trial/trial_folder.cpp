#include "host/trial/trial_folder.h"

#include "base/file.h"
#include "host/base/account_names.h"
#include "host/base/json.h"
#include "host/trial/trial_error.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <system_error>

namespace velt::host {

namespace {

constexpr const char* recordFile = "trial.json";
constexpr const char* lockFile = "start.lock";

std::string systemError() {
    return std::generic_category().message(errno);
}

std::string withSlash(const std::string& name) {
    return name.ends_with('/') ? name : name + "/";
}

} // namespace

TrialFolder TrialFolder::forStart(const std::filesystem::path& folder) {
    std::error_code error;
    std::filesystem::create_directories(folder, error);
    if (error) {
        throw TrialError("Cannot make the folder " + folder.string() + ": " + error.message() + ".");
    }
    return {folder, false};
}

TrialFolder TrialFolder::forStop(const std::filesystem::path& folder) {
    return {folder, true};
}

TrialFolder::TrialFolder(const std::filesystem::path& folder, bool forStop)
    : name_(withSlash(folder.string())), path_(std::filesystem::absolute(folder).lexically_normal()) {
    if (!path_.has_filename()) {
        path_ = path_.parent_path();
    }
    if (::chdir(path_.c_str()) != 0) {
        throw TrialError("Cannot enter " + name_ + ": " + systemError() + ".");
    }
    // Read-only, so that another user's can be opened, too.
    lock_ = UniqueFd(::open(lockFile, O_RDONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0644));
    struct stat status {};
    if (!lock_ || ::fstat(lock_.get(), &status) != 0) {
        throw TrialError("Cannot open " + name_ + lockFile + ": " + systemError() + ".");
    }
    if (status.st_uid != ::geteuid() && !(forStop && ::geteuid() == 0)) {
        const std::string owner = userName(status.st_uid);
        throw TrialError(name_ + " was made by " + owner + ". " +
                         (forStop ? "Stop it as that user, or as root."
                                  : "Start as that user, or stop what runs and remove " + name_ + "."));
    }
    if (::flock(lock_.get(), LOCK_EX) != 0) {
        throw TrialError("Cannot lock " + name_ + lockFile + ": " + systemError() + ".");
    }
}

TrialRecord TrialFolder::record() const {
    const auto text = valueOf(readOptionalFile(recordFile));
    if (!text) {
        return {};
    }
    const auto object = parseObject(*text);
    if (!object || !(*object)["place"].isString() || !(*object)["http_port"].isInt() ||
        !(*object)["build"].isString() || !(*object)["set_up"].isBool()) {
        throw TrialError(name_ + recordFile + " is damaged. Stop what runs and remove " + name_ + ".");
    }
    return {(*object)["place"].asString(), (*object)["http_port"].asInt(), (*object)["build"].asString(),
            (*object)["set_up"].asBool()};
}

void TrialFolder::store(const TrialRecord& record) const {
    Json::Value object(Json::objectValue);
    object["place"] = record.place.string();
    object["http_port"] = record.httpPort;
    object["build"] = record.build;
    object["set_up"] = record.setUp;
    check(replaceFile(recordFile, toJson(object) + "\n", 0644));
}

} // namespace velt::host
