// Many who change settings, and many changes.
#include "tests/load/load_service.h"
#include "tests/support/waiting.h"

#include <atomic>
#include <iostream>
#include <mutex>
#include <thread>

namespace velt::test {
namespace {

using std::chrono::seconds;

const std::string rulesPath = "/api/VELT.Core.FileServ.FTP.ChrootUser/v2/";
const std::string ftpPath = "/api/VELT.Core.FileServ.FTP/v3/";
const std::string securityPath = "/api/VELT.Core.FileServ.FTP.Security/v1/";
const std::string sftpPath = "/api/VELT.Core.FileServ.FTP.SFTP/v1/";

std::string ftpBody(const std::string& members) {
    return R"({"enable_ftp":true,"enable_ftps":false,)" + members + "}";
}

/// Below the ports that the kernel takes for outgoing connections: a small range among them is warned of.
std::string rangeOf(int number) {
    const int first = 20000 + number % 1000 * 10;
    return std::to_string(first) + ":" + std::to_string(first + 9);
}

std::string evenOrOdd(int number) {
    return number % 2 == 0 ? "true" : "false";
}

std::string shareOf(int number) {
    return number % 2 == 0 ? "/music" : "/public";
}

/// Changes fields that nobody else changes.
struct Administrator {
    std::string set;
    std::string get;
    std::string (*body)(int number);
    bool (*holds)(const Json::Value& settings, int number); ///< whether the settings are those of this body
};

const std::vector<Administrator> administrators{
    {ftpPath + "set", ftpPath + "get",
     [](int number) {
         const std::string rate = std::to_string(number);
         return ftpBody(R"("maxuploadrate":)" + rate + R"(,"maxdownloadrate":)" + rate);
     },
     [](const Json::Value& ftp, int number) {
         return ftp["maxuploadrate"] == number && ftp["maxdownloadrate"] == number;
     }},
    {ftpPath + "set", ftpPath + "get",
     [](int number) { return ftpBody(R"("timeout":)" + std::to_string(number)); },
     [](const Json::Value& ftp, int number) { return ftp["timeout"] == number; }},
    {ftpPath + "set", ftpPath + "get",
     [](int number) { return ftpBody(R"("max_conn_per_ip":)" + std::to_string(number)); },
     [](const Json::Value& ftp, int number) { return ftp["max_conn_per_ip"] == number; }},
    {ftpPath + "set", ftpPath + "get",
     [](int number) {
         return ftpBody(R"("custom_port_range":true,"custom_port":")" + rangeOf(number) + "\"");
     },
     [](const Json::Value& ftp, int number) { return ftp["custom_port"] == rangeOf(number); }},
    {ftpPath + "set", ftpPath + "get",
     [](int number) {
         const std::string value = evenOrOdd(number);
         return ftpBody(R"("enable_fxp":)" + value + R"(,"enable_ascii":)" + value);
     },
     [](const Json::Value& ftp, int number) {
         return ftp["enable_fxp"] == (number % 2 == 0) && ftp["enable_ascii"] == (number % 2 == 0);
     }},
    {sftpPath + "set", sftpPath + "get",
     [](int number) { return R"({"enable":true,"portnum":)" + std::to_string(2222 + number % 2) + "}"; },
     [](const Json::Value& sftp, int number) { return sftp["portnum"] == 2222 + number % 2; }},
    {securityPath + "set", securityPath + "get",
     [](int number) { return R"({"enable_umask":)" + evenOrOdd(number) + "}"; },
     [](const Json::Value& security, int number) { return security["enable_umask"] == (number % 2 == 0); }},
    {rulesPath + "save", rulesPath + "load",
     [](int number) {
         const std::string path = R"(","path":")" + shareOf(number) + "\"}";
         return R"({"rules":[{"type":"user","name":"alice)" + path + R"(,{"type":"user","name":"bob)" + path +
                "]}";
     },
     [](const Json::Value& answer, int number) {
         const Json::Value& rules = answer["rules"];
         return rules.size() == 2 && rules[0]["path"] == shareOf(number) &&
                rules[1]["path"] == shareOf(number);
     }},
};

/// Waits for the end of a former daemon that shares its port with the new one.
void waitForOneDaemonAPort() {
    EXPECT_TRUE(waitUntil(
        [] {
            return runProcess({"bash", "-c", "ss -Hltn | awk '{print $4}' | sort | uniq -d"}).output.empty();
        },
        patience));
}

/// Whether what one of them changes at once is seen at once.
bool isWhole(const std::string& path, const Json::Value& read) {
    if (path == rulesPath + "load") {
        const Json::Value& rules = read["rules"];
        return rules.empty() || (rules.size() == 2 && rules[0]["path"] == rules[1]["path"]);
    }
    const std::string range = read["custom_port"].asString();
    return read["maxuploadrate"] == read["maxdownloadrate"] && read["enable_fxp"] == read["enable_ascii"] &&
           (read["custom_port_range"] == false ||
            std::stoi(range) + 9 == std::stoi(range.substr(range.find(':') + 1)));
}

class Changes : public LoadService {
protected:
    void SetUp() override {
        LoadService::SetUp();
        Client root = asRoot();
        setFtp(root, R"("maxuploadrate":0,"maxdownloadrate":0,"enable_fxp":false,"enable_ascii":false)");
    }

    /// Changes until the time is over; the last number.
    int change(const Administrator& one) {
        Client client = asRoot();
        int number = 0;
        while (Clock::now() < end_) {
            ++number;
            const Answer changed = post(client, one.set, one.body(number));
            complainUnless(changed.status == 204, one.set + " " + changed.body);
            const Json::Value read = get(client, one.get);
            complainUnless(one.holds(read, number), one.body(number) + " is lost in " + textOf(read));
        }
        return number;
    }

    void look(const std::string& path) {
        Client client = asRoot();
        while (Clock::now() < end_) {
            const Json::Value read = get(client, path);
            complainUnless(isWhole(path, read), "torn: " + textOf(read));
            ++reads_;
        }
    }

    void complainUnless(bool good, const std::string& complaint) {
        if (!good) {
            const std::lock_guard lock(mutex_);
            complaints_ += complaint + "\n";
        }
    }

    Clock::time_point end_ = Clock::now();
    std::atomic<int> reads_{0};
    std::mutex mutex_;
    std::string complaints_;
};

TEST_F(Changes, OfEightWritersAreNotLostNorSeenInHalvesBySixtyFourReaders) {
    end_ = Clock::now() + inLongForm(seconds(60), seconds(3));
    std::vector<int> last(administrators.size());
    std::vector<std::thread> clients;
    for (std::size_t i = 0; i < administrators.size(); ++i) {
        clients.emplace_back([this, &last, i] { last[i] = change(administrators[i]); });
    }
    for (int i = 0; i < 64; ++i) {
        clients.emplace_back([this, i] { look(i % 4 == 0 ? rulesPath + "load" : ftpPath + "get"); });
    }
    for (std::thread& client : clients) {
        client.join();
    }
    EXPECT_EQ(complaints_, "");
    Client root = asRoot();
    int changes = 0;
    for (std::size_t i = 0; i < administrators.size(); ++i) {
        EXPECT_TRUE(administrators[i].holds(get(root, administrators[i].get), last[i]))
            << administrators[i].body(last[i]);
        EXPECT_GT(last[i], 1) << administrators[i].set;
        changes += last[i];
    }
    EXPECT_GT(reads_, changes);
    std::cout << changes << " changes, " << reads_ << " reads\n";
}

TEST_F(Changes, InGreatNumberLeaveNothingBehind) {
    const int count = inLongForm(10000, 60);
    const int settled = inLongForm(500, 20);
    Client root = asRoot();
    Holdings before;
    for (int i = 1; i <= count; ++i) {
        const Answer changed = setFtp(root, "\"timeout\":" + std::to_string(100 + i % 2));
        ASSERT_EQ(changed.status, 204) << i << " " << changed.body;
        if (i == settled) {
            waitForOneDaemonAPort();
            before = holdings();
        } else if (i % 100 == 0) {
            reap();
        }
    }
    waitForOneDaemonAPort();
    const Holdings after = holdings();
    std::cout << "after " << settled << " changes: " << before << "\nafter " << count << ": " << after
              << '\n';
    EXPECT_EQ(after.processes, before.processes);
    EXPECT_EQ(after.threads, before.threads);
    EXPECT_EQ(after.descriptors, before.descriptors);
    EXPECT_EQ(after.files, before.files);
    EXPECT_LT(after.hostKilobytes, before.hostKilobytes + 2048);
    EXPECT_LT(after.othersKilobytes, before.othersKilobytes + 2048);
}

} // namespace
} // namespace velt::test
