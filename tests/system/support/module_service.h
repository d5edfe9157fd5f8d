// Tests in which the module's requests move the real daemons.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_MODULE_SERVICE_H
#define VELT_TESTS_SYSTEM_SUPPORT_MODULE_SERVICE_H

#include "standalone/standalone.h"
#include "tests/system/support/clients.h"
#include "tests/system/support/files.h"
#include "tests/system/support/module_host.h"
#include "tests/system/support/private_world.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <mutex>
#include <string>
#include <vector>

namespace velt::test {

class ModuleService : public testing::Test {
protected:
    static constexpr int port = ftpTestPort;
    static constexpr int operationFailed = 1902;
    static constexpr int portConflict = 1903;
    static constexpr int rangeConflict = 1904;

    /// The platform's defaults in a fresh state root, but for users who are confined to their homes: both
    /// services are off.
    void SetUp() override;
    /// Switches both services off through the module. No process, mount or listening port may be left then.
    void TearDown() override;

    /// The members of the JSON text replace those of plain FTP on the port above.
    static ModuleAnswer setFtp(const std::string& changes = "{}", int version = 3);
    static Json::Value getFtp(int version = 3);
    static ModuleAnswer setSecurity(const std::string& parameters);
    static Json::Value getSecurity();
    static ModuleAnswer setSftp(const std::string& parameters);
    static Json::Value getSftp();
    static Json::Value json(const std::string& text);

    /// The log's entries since the start of the test, oldest first.
    std::vector<LogEntry> logEntries() const;
    std::vector<std::string> logSentences() const;
    /// "ftpd start", and so on, since the start of the test.
    std::vector<std::string> serviceActions();

private:
    std::string mounts_;
    std::int64_t lastEntry_ = 0;
    std::mutex mutex_;
    std::vector<std::string> actions_;
    Subscription subscription_ = 0;
};

} // namespace velt::test

#endif
