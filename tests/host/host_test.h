// The frame of a test of the host: the real HTTP server on a free port and a Unix socket, over the module in
// MODULE_PATH.
#ifndef VELT_TESTS_HOST_HOST_TEST_H
#define VELT_TESTS_HOST_HOST_TEST_H

#include "host/api/app.h"
#include "host/http/server.h"
#include "host/module/module_table.h"
#include "tests/host/client.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

class HostTest : public testing::Test {
protected:
    HostTest();
    ~HostTest() override;

    /// Starts the host as the members below say and makes the two tokens. Tests change the members before it.
    void start();
    void stop();

    void TearDown() override { stop(); }

    velt::host::AppSettings settings;
    velt::host::HttpLimits limits; ///< refused attempts are answered at once unless a test sets a delay
    velt::host::TlsFiles tls;
    std::vector<std::filesystem::path> modules{MODULE_PATH};

    std::filesystem::path folder; ///< gone after the test
    std::string socketPath;
    unsigned short port = 0;
    std::string admin;  ///< a header line with a token of the role
    std::string viewer; ///< a header line with a token of the role

    Client connect() const { return Client::tcp(port); }

    /// One request over a connection of its own, as admin.
    Answer get(const std::string& target) const;
    Answer post(const std::string& target, const std::string& body = "") const;
    Answer ask(const std::string& method, const std::string& target, const std::string& headers = "",
               const std::string& body = "") const;

    /// The host's own log, and whether a line of it holds the text.
    std::vector<std::string> logLines() const;
    bool logged(const std::string& text) const;

    std::unique_ptr<velt::host::ModuleTable> table;
    std::unique_ptr<velt::host::App> app;
    std::unique_ptr<velt::host::HttpServer> server;

private:
    std::string makeToken(const std::string& name) const;

    mutable std::mutex mutex_;
    std::vector<std::string> lines_;
    velt::host::HostLog log_;
};

#endif
