#include "ftp/ftp_library.h"

#include "standalone/contract/boundary.h"
#include "standalone/contract/last_error.h"
#include "standalone/control/change_settings.h"
#include "standalone/rules/chroot_users.h"
#include "standalone/rules/rule_store.h"
#include "standalone/settings/record_merge.h"
#include "standalone/settings/settings_store.h"
#include "standalone/shares/share_store.h"

#include <cstring>

namespace velt {

namespace {

template<class Value> int loadSetting(Value FtpSettings::*setting) {
    return atBoundary([&]() -> Result<int> {
        VELT_ASSIGN_OR_RETURN(const FtpSettings settings, loadFtpFile());
        return static_cast<int>(settings.*setting);
    });
}

template<class Value> int storeSetting(Value FtpSettings::*setting, Value value) {
    return atBoundary(
        [&] { return changeFtpSettings([&](FtpSettings& settings) { settings.*setting = value; }); });
}

LastSeen<_tag_VELT_FTP_CONF_>& lastSeenRecord() {
    thread_local LastSeen<_tag_VELT_FTP_CONF_> seen;
    return seen;
}

Result<> loadRecord(_tag_VELT_FTP_CONF_& record) {
    lastSeenRecord().forget();
    VELT_ASSIGN_OR_RETURN(const FtpSettings settings, loadFtpFile());
    record = settings.record;
    lastSeenRecord().note(record);
    return {};
}

Result<> storeRecord(const _tag_VELT_FTP_CONF_& record) {
    VELT_RETURN_IF_ERROR(changeFtpSettings([&record](FtpSettings& settings) {
        settings.record = lastSeenRecord().merge(settings.record, record);
    }));
    // Not what was stored: the caller continues with its own copy.
    lastSeenRecord().note(record);
    return {};
}

int missing(const char* what) {
    return fail(ErrorNumber::invalid, std::string(what) + " is required.");
}

int pushAll(VLIBCSzList** list, const Result<std::vector<std::string>>& texts) {
    if (list == nullptr || *list == nullptr)
        return missing("A list for the names");
    if (!texts)
        return fail(texts.error());
    for (const std::string& text : *texts)
        if (VLIBCSzListPush(list, text.c_str()) < 0)
            return -1;
    return 0;
}

std::vector<std::string> textsOf(const VLIBCSzList* list) {
    std::vector<std::string> texts;
    for (int i = 0; list != nullptr && i < list->count; i++)
        texts.emplace_back(VLIBCSzListGet(list, i));
    return texts;
}

// The selection under which the module lists what is offered to FTP; it asks for no other.
constexpr int offeredToFtp = 0x207;

Result<std::vector<std::string>> shareNames(int selection) {
    if (selection != offeredToFtp)
        return Error(ErrorNumber::invalid, "Only the shares that are offered to FTP can be listed.");
    VELT_ASSIGN_OR_RETURN(const auto shares, loadShares());
    std::vector<std::string> names;
    for (const ShareEntry& share : shares)
        if (share.offeredToFtp)
            names.push_back(share.name);
    return names;
}

UserFilter filterOf(int source, const char* substr, const char* domain) {
    return {source, substr != nullptr ? substr : "", domain != nullptr ? domain : ""};
}

Result<std::vector<std::string>> ruleLines() {
    VELT_ASSIGN_OR_RETURN(const auto rules, loadRules());
    std::vector<std::string> lines;
    for (const ChrootRule& rule : rules)
        lines.push_back(formatRule(rule));
    return lines;
}

Result<> storeRuleLines(const std::vector<std::string>& lines) {
    std::vector<ChrootRule> rules;
    for (const std::string& line : lines) {
        auto rule = parseRule(line);
        if (!rule)
            return Error(ErrorNumber::invalid, "Chroot rule " + std::to_string(rules.size() + 1) + ": " +
                                                   rule.error().message + ".");
        rules.push_back(std::move(*rule));
    }
    return storeRules(rules);
}

bool fits(const std::string& text, int size) {
    return size > 0 && text.size() < static_cast<std::size_t>(size);
}

void copyText(const std::string& text, char* buffer) {
    std::memcpy(buffer, text.c_str(), text.size() + 1);
}

Result<> splitRule(const char* line, int* isUser, char* name, int nameSize, char* path, int pathSize) {
    const auto rule = parseRule(line != nullptr ? line : "");
    if (!rule)
        return Error(rule.error().number, "Cannot read the chroot rule: " + rule.error().message + ".");
    VELT_ASSIGN_OR_RETURN(const auto owner, ownerOf(*rule));
    if (!fits(owner, nameSize) || !fits(rule->path, pathSize))
        return Error(ErrorNumber::invalid, "The chroot rule of " + owner + " is too long.");
    *isUser = rule->isUser ? 1 : 0;
    copyText(owner, name);
    copyText(rule->path, path);
    return {};
}

Result<> writeRule(char* buffer, int size, bool isUser, int id, const char* path) {
    VELT_ASSIGN_OR_RETURN(const auto rule, makeRule(isUser, id, path != nullptr ? path : ""));
    const std::string line = formatRule(rule);
    if (!fits(line, size))
        return Error(ErrorNumber::invalid, "The path of the chroot rule is too long.");
    copyText(line, buffer);
    return {};
}

} // namespace

} // namespace velt

int VELTFTPConfGet(_tag_VELT_FTP_CONF_* out) {
    if (out == nullptr)
        return velt::missing("A record for the FTP settings");
    return velt::atBoundary([out] { return velt::loadRecord(*out); });
}

int VELTFTPConfSet(_tag_VELT_FTP_CONF_ conf) {
    return velt::atBoundary([&conf] { return velt::storeRecord(conf); });
}

int VELTFTPTimeOutGet(void) {
    return velt::loadSetting(&velt::FtpSettings::timeout);
}

int VELTFTPTimeOutSet(int timeout) {
    return velt::storeSetting(&velt::FtpSettings::timeout, timeout);
}

int VELTFTPUseUTF8Get(void) {
    return velt::loadSetting(&velt::FtpSettings::useUtf8);
}

int VELTFTPUseUTF8Set(int enable) {
    return velt::storeSetting(&velt::FtpSettings::useUtf8, enable != 0);
}

int VELTFTPFIPSEnabledGet(void) {
    return velt::loadSetting(&velt::FtpSettings::fipsOnly);
}

int VELTFTPFIPSEnabledSet(int enable) {
    return velt::storeSetting(&velt::FtpSettings::fipsOnly, enable != 0);
}

int VELTFTPASCIIEnabledGet(void) {
    return velt::loadSetting(&velt::FtpSettings::ascii);
}

int VELTFTPASCIIEnabledSet(int enable) {
    return velt::storeSetting(&velt::FtpSettings::ascii, enable != 0);
}

int VELTFTPUmaskEnabledGet(void) {
    return velt::loadSetting(&velt::FtpSettings::umask);
}

int VELTFTPUmaskEnabledSet(bool enable) {
    return velt::storeSetting(&velt::FtpSettings::umask, enable);
}

int VELTFTPDefaultPassivePortGet(VELT_FTP_PORT_RANGE* out) {
    if (out == nullptr)
        return velt::missing("A record for the default passive range");
    *out = velt::defaultPassiveRange;
    return 0;
}

int VELTFTPShareEnum(VLIBCSzList** list, int selection) {
    return velt::atBoundary([&] { return velt::pushAll(list, velt::shareNames(selection)); });
}

int VELTFTPChrootUserEnum(VLIBCSzList** list, int source, const char* substr, const char* domain) {
    return velt::atBoundary(
        [&] { return velt::pushAll(list, velt::chrootUsers(velt::filterOf(source, substr, domain))); });
}

int VELTFTPNonChrootUserEnum(VLIBCSzList** list, int source, const char* substr, const char* domain) {
    return velt::atBoundary(
        [&] { return velt::pushAll(list, velt::otherUsers(velt::filterOf(source, substr, domain))); });
}

int VELTFTPAddChrootUser(VLIBCSzList* list) {
    return velt::atBoundary([&] { return velt::addChrootUsers(velt::textsOf(list)); });
}

int VELTFTPDeleteChrootUser(VLIBCSzList* list) {
    return velt::atBoundary([&] { return velt::deleteChrootUsers(velt::textsOf(list)); });
}

int VELTFTPChrootRuleEnum(VLIBCSzList** list) {
    return velt::atBoundary([&] { return velt::pushAll(list, velt::ruleLines()); });
}

int VELTFTPChrootRuleParseToName(const char* line, int* isUser, char* name, int nameSize, char* path,
                                 int pathSize) {
    return velt::atBoundary([&] { return velt::splitRule(line, isUser, name, nameSize, path, pathSize); });
}

int VELTFTPChrootRuleFormat(char* buf, int size, int isUser, int id, const char* path) {
    return velt::atBoundary([&] { return velt::writeRule(buf, size, isUser != 0, id, path); });
}

int VELTFTPChrootRuleSave(VLIBCSzList* list) {
    return velt::atBoundary([&] { return velt::storeRuleLines(velt::textsOf(list)); });
}
