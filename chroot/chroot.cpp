#include "chroot/chroot.h"

#include "ftp/ftp_library.h"
#include "handler/log.h"
#include "handler/owners.h"
#include "platform/account.h"
#include "platform/share.h"

#include <sys/stat.h>

#include <string>

namespace {

constexpr int nameSize = 492;
constexpr int pathSize = 4096;
constexpr int lineSize = 2048;

/// The path of a rule that confines to the home folder; it is no share.
constexpr char homePath[] = "/home";

bool isDirectory(const std::string& path) {
    struct stat64 status {};
    return stat64(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode);
}

/// Whether the directory of a rule ("/share" or "/share/below") exists now. An empty path is out of range for
/// the split and leaves as std::out_of_range.
bool pathExists(const std::string& path) {
    if (path == homePath) {
        return true;
    }
    const std::string::size_type slash = path.find('/', 1);
    const bool hasRest = slash != std::string::npos;
    const std::string shareName = path.substr(1, hasRest ? slash - 1 : std::string::npos);
    const std::string rest = hasRest ? path.substr(slash + 1) : std::string();
    ShareHandle share;
    if (VELTShareGet(shareName.c_str(), share.address()) < 0) {
        return false;
    }
    const std::string directory = share.get()->path;
    return isDirectory(rest.empty() ? directory : directory + "/" + rest);
}

/// The user and group records of one save: each look-up may reuse the one before. The platform owns them.
struct Accounts {
    VELT_USER* user = nullptr;
    VELT_GROUP* group = nullptr;
};

/// The id of the user or group that a rule names; false when there is none.
bool resolve(Accounts& accounts, bool isUser, const std::string& name, int& id) {
    if (isUser) {
        if (VELTUserGet(name.c_str(), &accounts.user) < 0) {
            VELT_LOG_LAST_ERROR("Failed to VELTUserGet(). [%s][0x%04X %s:%d]", name.c_str());
            return false;
        }
        id = accounts.user->uid;
        return true;
    }
    if (VELTGroupGet(name.c_str(), &accounts.group) < 0) {
        VELT_LOG_LAST_ERROR("Failed to VELTGroupGet(). [%s][0x%04X %s:%d]", name.c_str());
        return false;
    }
    id = accounts.group->gid;
    return true;
}

/// Pushes the lines of the rules. A rule that cannot be resolved, formatted or pushed is left out.
void pushRules(const Json::Value& rules, SzList& list) {
    char line[lineSize] = {};
    Accounts accounts;
    for (Json::ArrayIndex i = 0; i < rules.size(); ++i) {
        const Json::Value& rule = rules[i];
        const bool isUser = rule["type"].asString() == "user";
        int id = 0;
        if (resolve(accounts, isUser, rule["name"].asString(), id) &&
            VELTFTPChrootRuleFormat(line, lineSize, isUser ? 1 : 0, id, rule["path"].asString().c_str()) >=
                0) {
            list.push(line);
        }
    }
}

} // namespace

FTPChrootServiceHandler::FTPChrootServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response)
    : ServiceHandler(request, response) {}

void FTPChrootServiceHandler::Load() {
    RequestWriter writer;
    Json::Value result;
    if (LoadRule(result)) {
        ReportSuccess(result);
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

void FTPChrootServiceHandler::Save() {
    RequestWriter writer;
    const Json::Value params = fetchParams();
    if (SaveRule(params)) {
        ReportSuccess();
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

bool FTPChrootServiceHandler::LoadRule(Json::Value& result) {
    SzList list;
    if (!list) {
        return VELT_FAIL_LAST_ERROR(*this, ErrorCode::operationFailed,
                                    "Failed to malloc for list.[0x%04X %s:%d]");
    }
    if (VELTFTPChrootRuleEnum(list.address()) < 0) {
        return VELT_FAIL_LAST_ERROR(*this, ErrorCode::operationFailed,
                                    "Failed to VELTFTPChrootRuleEnum().[0x%04X %s:%d]");
    }
    // Zeroed for the first line only: what a line's parser leaves alone keeps the value of the line before.
    int isUser = 0;
    char name[nameSize] = {};
    char path[pathSize] = {};
    Json::Value rules(Json::arrayValue);
    for (int i = 0; i < list.count(); ++i) {
        if (VELTFTPChrootRuleParseToName(list.at(i), &isUser, name, nameSize, path, pathSize) < 0) {
            continue;
        }
        Json::Value rule;
        rule["name"] = name;
        rule["type"] = isUser != 0 ? "user" : "group";
        rule["path"] = path;
        rule["path_exist"] = pathExists(path);
        rules.append(rule);
    }
    result["total"] = static_cast<int>(rules.size());
    result["rules"] = rules;
    return true;
}

bool FTPChrootServiceHandler::SaveRule(const Json::Value& params) {
    SzList list;
    if (!list) {
        return VELT_FAIL_LAST_ERROR(*this, ErrorCode::operationFailed,
                                    "Failed to malloc for list.[0x%04X %s:%d]");
    }
    pushRules(params["rules"], list);
    if (VELTFTPChrootRuleSave(list.get()) < 0) {
        return VELT_FAIL_LAST_ERROR(*this, ErrorCode::operationFailed,
                                    "Failed to VELTFTPChrootRuleSave().[0x%04X %s:%d]");
    }
    return true;
}
