#include "tests/host/host_test.h"

#include "tests/host/fake_standalone.h"

#include <cstdlib>
#include <stdexcept>

using velt::host::Listener;

HostTest::HostTest()
    : log_([this](const std::string& line) {
          const std::lock_guard lock(mutex_);
          lines_.push_back(line);
      }) {
    std::string name = (std::filesystem::temp_directory_path() / "velt-host-XXXXXX").string();
    if (mkdtemp(name.data()) == nullptr) {
        throw std::runtime_error("no folder for the test");
    }
    folder = name;
    socketPath = folder / "veltd.sock";
    settings.tokenFile = folder / "state/tokens.json";
    limits.refusalDelay = std::chrono::milliseconds(0);
    limits.sweep = std::chrono::milliseconds(20);
}

HostTest::~HostTest() {
    std::error_code ignored;
    std::filesystem::remove_all(folder, ignored);
}

void HostTest::start() {
    table = std::make_unique<velt::host::ModuleTable>();
    for (const auto& module : modules) {
        table->load(module);
    }
    const bool isFirst =
        !std::filesystem::exists(settings.tokenFile); // else the tokens of the former start hold
    app = std::make_unique<velt::host::App>(settings, *table, log_);
    server = std::make_unique<velt::host::HttpServer>(*app, limits, tls);
    Listener tcp = Listener::tcp("127.0.0.1:0", false);
    port = tcp.port();
    server->add(std::move(tcp));
    server->add(Listener::unixSocket(socketPath, settings.access.adminGroup));
    app->begin();
    server->start(2);
    if (isFirst) {
        admin = "Authorization: Bearer " + makeToken("admin") + "\r\n";
        viewer = "Authorization: Bearer " + makeToken("viewer") + "\r\n";
    }
    FakeStandalone::instance().audit.clear(); // of the tokens
}

void HostTest::stop() {
    if (server != nullptr) {
        server->stop(std::chrono::seconds(10));
        app->stop();
    }
    server.reset();
    app.reset();
    table.reset();
}

std::string HostTest::makeToken(const std::string& name) const {
    Client client = Client::unixSocket(socketPath);
    const Answer made = client.ask(
        requestText("POST", "/api/tokens", "", R"({"name":")" + name + R"(","role":")" + name + "\"}"));
    EXPECT_EQ(made.status, 201) << made.body;
    return made.json()["token"].asString();
}

Answer HostTest::ask(const std::string& method, const std::string& target, const std::string& headers,
                     const std::string& body) const {
    Client client = connect();
    return client.ask(requestText(method, target, headers, body));
}

Answer HostTest::get(const std::string& target) const {
    return ask("GET", target, admin);
}

Answer HostTest::post(const std::string& target, const std::string& body) const {
    return ask("POST", target, admin, body);
}

std::vector<std::string> HostTest::logLines() const {
    const std::lock_guard lock(mutex_);
    return lines_;
}

bool HostTest::logged(const std::string& text) const {
    for (const std::string& line : logLines()) {
        if (line.find(text) != std::string::npos) {
            return true;
        }
    }
    return false;
}
