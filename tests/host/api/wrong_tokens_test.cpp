// Wrong tokens are counted beside the requests.

#include "host/api/wrong_tokens.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/waiting.h"

#include <atomic>
#include <memory>
#include <stdexcept>
#include <thread>

namespace {

using std::chrono::seconds;
using velt::host::HostLog;
using velt::host::WrongTokens;
using velt::test::patience;
using velt::test::waitUntil;
using Texts = std::vector<std::string>;

/// Keeps whoever counts a failed login until it is opened.
struct Gate {
    std::atomic<int> entered{0};
    std::atomic<int> left{0};
    std::atomic<bool> open{false};
};

std::shared_ptr<Gate> holdNoted() {
    const auto gate = std::make_shared<Gate>();
    FakeStandalone::instance().whileNoted = [gate] {
        ++gate->entered;
        waitUntil([&] { return gate->open.load(); }, seconds(5));
        ++gate->left;
    };
    return gate;
}

bool isHeld(const Gate& gate) {
    return waitUntil([&] { return gate.entered > 0; }, patience);
}

class HostWrongTokens : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
    }

    void TearDown() override {
        HostTest::TearDown();
        FakeStandalone::instance() = {};
    }
};

TEST_F(HostWrongTokens, DelayNobodyElse) {
    start();
    const auto gate = holdNoted();
    std::vector<Client> guessers;
    for (int i = 0; i < 4; ++i) { // more than the server has threads
        guessers.push_back(connect());
        guessers.back().send(requestText("GET", "/api/status", "Authorization: Bearer wrong\r\n"));
    }
    ASSERT_TRUE(isHeld(*gate));
    EXPECT_EQ(Client::unixSocket(socketPath).ask(requestText("GET", "/healthz")).status, 200);
    EXPECT_EQ(get("/api/status").status, 200);
    for (Client& guesser : guessers) {
        EXPECT_EQ(guesser.receive().status, 401);
    }
    EXPECT_EQ(gate->left, 0) << "the answers waited";
    gate->open = true;
    EXPECT_TRUE(waitUntil([] { return FakeStandalone::instance().noted().size() == 4; }, patience));
}

class CountingWrongTokens : public testing::Test {
protected:
    void SetUp() override { FakeStandalone::instance() = {}; }
    void TearDown() override { FakeStandalone::instance() = {}; }

    Texts lines; ///< of the log, to read after a stop
    HostLog log{[this](const std::string& line) { lines.push_back(line); }};
    FakeStandalone& fake = FakeStandalone::instance();
};

TEST_F(CountingWrongTokens, DropsWhatDoesNotFit) {
    const auto gate = holdNoted();
    WrongTokens tokens(log, 2);
    tokens.note("192.0.2.1");
    ASSERT_TRUE(isHeld(*gate));
    for (const char* address : {"192.0.2.2", "192.0.2.3", "192.0.2.4"}) {
        tokens.note(address);
    }
    gate->open = true;
    ASSERT_TRUE(waitUntil([&] { return fake.noted().size() >= 3; }, patience));
    tokens.note("192.0.2.5");
    ASSERT_TRUE(waitUntil([&] { return fake.noted().size() >= 4; }, patience));
    EXPECT_EQ(fake.noted(),
              (Texts{"veltd 192.0.2.1", "veltd 192.0.2.2", "veltd 192.0.2.3", "veltd 192.0.2.5"}));
}

TEST_F(CountingWrongTokens, LosesNoneOfOneSourceBecauseOfAnother) {
    const auto gate = holdNoted();
    WrongTokens tokens(log, 2);
    tokens.note("2001:db8:1::1");
    ASSERT_TRUE(isHeld(*gate));
    for (int i = 0; i < 3 * WrongTokens::mostOfOne; ++i) {
        tokens.note("2001:db8:1::" + std::to_string(i));
    }
    tokens.note("192.0.2.2");
    tokens.note("192.0.2.2");
    gate->open = true;
    ASSERT_TRUE(waitUntil([&] { return fake.noted().size() >= WrongTokens::mostOfOne + 3; }, patience));
    tokens.stop();
    const Texts noted = fake.noted();
    EXPECT_EQ(noted.size(), WrongTokens::mostOfOne + 3);
    EXPECT_EQ(Texts(noted.begin(), noted.begin() + 6),
              (Texts{"veltd 2001:db8:1::1", "veltd 2001:db8:1::0", "veltd 192.0.2.2", "veltd 2001:db8:1::0",
                     "veltd 192.0.2.2", "veltd 2001:db8:1::0"}));
}

TEST_F(CountingWrongTokens, DropsWhatWaitsAtTheEnd) {
    constexpr std::size_t many = 1000;
    fake.whileNoted = [] { std::this_thread::sleep_for(std::chrono::milliseconds(10)); };
    WrongTokens tokens(log, many);
    for (std::size_t i = 0; i < many; ++i) {
        tokens.note("192.0.2.1");
    }
    tokens.stop();
    const std::size_t counted = fake.noted().size();
    EXPECT_LT(counted, many);
    tokens.note("192.0.2.2");
    tokens.stop();
    EXPECT_EQ(fake.noted().size(), counted);
}

TEST_F(CountingWrongTokens, BansAnAddressOnce) {
    const auto gate = holdNoted();
    WrongTokens tokens(log);
    tokens.note("192.0.2.1");
    ASSERT_TRUE(isHeld(*gate));
    tokens.note("192.0.2.1");
    tokens.note("192.0.2.2");
    // What the first one does that is being counted.
    const auto until = std::chrono::system_clock::now() + seconds(600);
    fake.bans.push_back({velt::parseIpNetwork("192.0.2.1").value(), until, "veltd", 10});
    gate->open = true;
    ASSERT_TRUE(waitUntil([&] { return fake.noted().size() >= 2; }, patience));
    EXPECT_EQ(fake.noted(), (Texts{"veltd 192.0.2.1", "veltd 192.0.2.2"}));
}

TEST_F(CountingWrongTokens, GoesOnAfterAFailure) {
    std::atomic<int> calls{0};
    fake.whileNoted = [&] {
        if (++calls == 1) {
            throw std::runtime_error("no memory");
        }
    };
    WrongTokens tokens(log);
    tokens.note("192.0.2.1");
    tokens.note("192.0.2.2");
    ASSERT_TRUE(waitUntil([&] { return !fake.noted().empty(); }, patience));
    tokens.stop();
    EXPECT_EQ(fake.noted(), Texts{"veltd 192.0.2.2"});
    ASSERT_EQ(lines.size(), 1U);
    EXPECT_NE(lines[0].find("cannot count a wrong token: no memory"), std::string::npos) << lines[0];
}

} // namespace
