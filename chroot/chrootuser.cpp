#include "chroot/chrootuser.h"

#include "ftp/ftp_library.h"
#include "handler/log.h"
#include "handler/owners.h"
#include "handler/parameter_types.h"
#include "platform/adminlog.h"

#include <strings.h>

#include <algorithm>
#include <iterator>

namespace {

constexpr int noLimit = -1;
constexpr int listFlags = 16;

constexpr int logCategory = 1;
constexpr int logLevel = 1;
constexpr unsigned eventUserAdded = 0x11B00024;
constexpr unsigned eventUserDeleted = 0x11B00025;

constexpr int sourceLocal = 1;

struct Source {
    const char* type;
    int code;
};

constexpr Source sources[] = {
    {"local", sourceLocal},
    {"domain", 2},
    {"ldap", 8},
    {"all", 11},
};

constexpr Parameter optionalParameters[] = {
    {"offset", &Json::Value::isInt},    {"limit", &Json::Value::isInt},
    {"type", &Json::Value::isString},   {"domain_name", &Json::Value::isString},
    {"substr", &Json::Value::isString},
};

int intOr(const Json::Value& value, int absent) {
    return value.isNull() ? absent : value.asInt();
}

const char* textOrNull(const Json::Value& value) {
    return value.isNull() ? nullptr : value.asCString();
}

/// An unknown type stands for local users, like an absent one.
int sourceCode(const Json::Value& type) {
    if (type.isNull()) {
        return sourceLocal;
    }
    const auto* const found =
        std::find_if(std::begin(sources), std::end(sources), [&type](const Source& source) {
            return strcasecmp(type.asCString(), source.type) == 0;
        });
    return found == std::end(sources) ? sourceLocal : found->code;
}

/// A page of a list: the entries from `first` up to, not including, `end`.
struct Page {
    int first;
    int end;
};

// An offset outside the list yields the first page, a negative limit other than "none" an empty one.
Page pageOf(int count, int offset, int limit) {
    const int first = offset < 0 || offset >= count ? 0 : offset;
    const int rest = count - first;
    return {first, first + (limit == noLimit ? rest : std::clamp(limit, 0, rest))};
}

Json::Value describe(const char* name) {
    Json::Value user;
    user["id"] = name;
    user["name"] = name;
    user["descr"] = LoadedUser(name).description();
    return user;
}

/// Whether "id" names users at all; its elements are looked at one by one.
bool hasIds(const Json::Value& params) {
    const Json::Value& ids = params["id"];
    return ids.isArray() && !ids.empty();
}

/// Puts the texts of "id" into the list. What is no text, or cannot be pushed, is left out.
void pushIds(const Json::Value& ids, SzList& list) {
    list.get()->flags = listFlags;
    for (const Json::Value& id : ids) {
        if (id.isString() && list.push(id.asCString()) < 0) {
            VELT_LOG("Failed to VLIBCSzListPush.");
        }
    }
}

void addEntry(unsigned event, const char* arg1) {
    VELTLogSet1(logCategory, logLevel, event, arg1, "", "", "");
}

} // namespace

FTPChrootUserServiceHandler::FTPChrootUserServiceHandler(VELT::APIRequest* request,
                                                         VELT::APIResponse* response)
    : ServiceHandler(request, response) {}

void FTPChrootUserServiceHandler::List() {
    RequestWriter writer;
    const Json::Value params = fetchParams();
    Json::Value result;
    if (ListUser(params, result)) {
        ReportSuccess(result);
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

void FTPChrootUserServiceHandler::Add() {
    RequestWriter writer;
    const Json::Value params = fetchParams();
    Json::Value result;
    if (AddUser(params, result)) {
        ReportSuccess(result);
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

void FTPChrootUserServiceHandler::Delete() {
    RequestWriter writer;
    const Json::Value params = fetchParams();
    if (DeleteUser(params)) {
        ReportSuccess();
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

bool FTPChrootUserServiceHandler::ListUser(const Json::Value& params, Json::Value& result) {
    if (!params["chroot"].isBool()) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "bool variable 'chroot' is missing.");
    }
    if (!haveTypesIfPresent(params, optionalParameters)) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "Invalid type of input.");
    }
    const int source = sourceCode(params["type"]);
    const char* const domain = textOrNull(params["domain_name"]);
    const char* const substr = params["substr"].asString().empty() ? nullptr : params["substr"].asCString();
    SzList list;
    if (!list) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to malloc for list.");
    }
    if (params["chroot"].asBool()) {
        if (VELTFTPChrootUserEnum(list.address(), source, substr, domain) < 0) {
            return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get chroot user list.");
        }
    } else if (VELTFTPNonChrootUserEnum(list.address(), source, substr, domain) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get non chroot user list.");
    }
    const Page page = pageOf(list.count(), intOr(params["offset"], 0), intOr(params["limit"], noLimit));
    Json::Value users(Json::arrayValue);
    for (int i = page.first; i < page.end; ++i) {
        users.append(describe(list.at(i)));
    }
    result["total"] = list.count();
    result["user"] = users;
    return true;
}

bool FTPChrootUserServiceHandler::AddUser(const Json::Value& params, Json::Value& result) {
    if (!hasIds(params)) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "array variable 'id' is missing or empty.");
    }
    SzList list;
    if (!list) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to malloc for list.");
    }
    pushIds(params["id"], list);
    if (list.count() > 0 && VELTFTPAddChrootUser(list.get()) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to add chroot users.");
    }
    Json::Value added(Json::arrayValue);
    for (int i = 0; i < list.count(); ++i) {
        const char* const name = list.at(i);
        addEntry(eventUserAdded, name);
        added.append(name);
    }
    result["chrootuser_id"] = added;
    return true;
}

bool FTPChrootUserServiceHandler::DeleteUser(const Json::Value& params) {
    if (!hasIds(params)) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "array variable 'id' is missing or empty.");
    }
    SzList list;
    if (!list) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to malloc for list.");
    }
    pushIds(params["id"], list);
    if (list.count() > 0 && VELTFTPDeleteChrootUser(list.get()) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to delete chroot users.");
    }
    for (int i = 0; i < list.count(); ++i) {
        addEntry(eventUserDeleted, list.at(i));
    }
    return true;
}
