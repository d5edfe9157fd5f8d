// Settings, changed by veltctl and by curl, with what a client sees of each value.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SETTING_TABLE_H
#define VELT_TESTS_SYSTEM_SUPPORT_SETTING_TABLE_H

#include "tests/system/support/host_service.h"

#include <functional>
#include <string>
#include <vector>

namespace velt::test {

/// One setting, two of its values, and the proof that the services follow.
struct SettingCase {
    std::string group; ///< ftp, security or sftp
    std::string key;
    Json::Value one; ///< not the value that the setting has at first
    Json::Value other;
    std::function<void(const Json::Value& value)> prove; ///< fails the test when a client sees another value
    std::vector<std::string> before;                     ///< words for "set" that the proof needs beforehand
    std::string along; ///< JSON members that a request has to carry beside it
    int version = 3;   ///< of the FTP settings
};

class SettingTable : public HostService {
protected:
    /// For each case: veltctl sets one value and curl the other; both read it, and the proof is asked for.
    void check(const std::vector<SettingCase>& cases) const;

private:
    void checkOne(const SettingCase& setting) const;
    void setByVeltctl(const SettingCase& setting, const Json::Value& value) const;
    void setByCurl(const SettingCase& setting, const Json::Value& value) const;
    void expectValue(const SettingCase& setting, const Json::Value& value) const;
    std::string pathOf(const SettingCase& setting) const;
};

} // namespace velt::test

#endif
