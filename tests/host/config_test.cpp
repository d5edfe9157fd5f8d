// The host's settings, its log, and the lines that modules write to the system log.

#include "host/base/host_log.h"
#include "host/config.h"
#include "host/module/module_log.h"

#include <gtest/gtest.h>
#include <syslog.h>

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <regex>
#include <set>
#include <thread>

namespace {

using velt::host::Config;
using velt::host::ConfigError;
using velt::host::ModuleLog;
using velt::host::readConfig;

/// A configuration file, gone at the end.
class ConfigFile {
public:
    explicit ConfigFile(const std::string& text) {
        const int descriptor = mkstemp(name_.data());
        EXPECT_GE(descriptor, 0);
        close(descriptor);
        std::ofstream(name_) << text;
    }
    ~ConfigFile() { std::remove(name_.c_str()); }
    ConfigFile(const ConfigFile&) = delete;
    ConfigFile& operator=(const ConfigFile&) = delete;

    const std::string& name() const { return name_; }

private:
    std::string name_ = (std::filesystem::temp_directory_path() / "velt-config-XXXXXX").string();
};

/// One setting: its name, a value on the command line and the same in a file, and how it arrives.
struct Case {
    const char* name;
    const char* word; ///< null for a flag
    const char* json;
    bool (*arrived)(const Config&);
};

using std::chrono::seconds;

const std::vector<Case> cases{
    {"admin-group", "staff", R"("staff")", [](const Config& c) { return c.adminGroup == "staff"; }},
    {"allow-remote", nullptr, "true", [](const Config& c) { return c.allowRemote; }},
    {"body-seconds", "7", "7", [](const Config& c) { return c.limits.bodyTime == seconds(7); }},
    {"head-seconds", "7", "7", [](const Config& c) { return c.limits.headTime == seconds(7); }},
    {"host-name", "nas", R"(["nas"])",
     [](const Config& c) { return c.hostNames == std::vector<std::string>{"nas"}; }},
    {"idle-seconds", "7", "7", [](const Config& c) { return c.limits.idleTime == seconds(7); }},
    {"io-threads", "7", "7", [](const Config& c) { return c.ioThreads == 7; }},
    {"listen", "[::1]:80", R"(["[::1]:80"])",
     [](const Config& c) { return c.listen == std::vector<std::string>{"[::1]:80"}; }},
    {"max-body", "2048", "2048", [](const Config& c) { return c.limits.body == 2048; }},
    {"max-connections", "7", "7", [](const Config& c) { return c.limits.connections == 7; }},
    {"max-head", "2048", "2048", [](const Config& c) { return c.limits.head == 2048; }},
    {"module", "b.so", R"(["b.so"])", [](const Config& c) { return c.modules.back() == "b.so"; }},
    {"print-ready", nullptr, "true", [](const Config& c) { return c.printReady; }},
    {"socket", "/s", R"("/s")", [](const Config& c) { return c.socketPath() == "/s"; }},
    {"state-root", "/x", R"("/x")",
     [](const Config& c) {
         return c.socketPath() == "/x/run/velt/veltd.sock" && c.tokenFile() == "/x/var/lib/velt/tokens.json";
     }},
    {"stop-seconds", "0", "0", [](const Config& c) { return c.stopTime == seconds(0); }},
    {"tls-certificate", "/c", R"("/c")", [](const Config& c) { return c.tls.certificate == "/c"; }},
    {"tls-key", "/k", R"("/k")", [](const Config& c) { return c.tls.key == "/k"; }},
    {"workers", "7", "7", [](const Config& c) { return c.workers == 7; }},
    {"write-seconds", "7", "7", [](const Config& c) { return c.limits.writeTime == seconds(7); }},
};

/// What some settings need beside them.
const std::vector<std::string> company{"--module", "a.so", "--tls-certificate", "c", "--tls-key", "k"};

std::string refusal(const std::vector<std::string>& words) {
    try {
        readConfig(words);
        return "";
    } catch (const ConfigError& error) {
        return error.what();
    }
}

std::string refusalOfFile(const std::string& text) {
    const ConfigFile file(text);
    std::string reason = refusal({"--module", "a.so", "--config", file.name()});
    const std::string start = "The configuration file " + file.name();
    EXPECT_TRUE(reason.starts_with(start)) << text << ": " << reason;
    return reason.substr(std::min(start.size(), reason.size()));
}

TEST(Config, EverySettingIsAnOption) {
    for (const Case& each : cases) {
        std::vector<std::string> words = company;
        EXPECT_FALSE(each.arrived(readConfig(words))) << each.name;
        words.push_back(std::string("--") + each.name);
        if (each.word != nullptr) {
            words.push_back(each.word);
        }
        EXPECT_TRUE(each.arrived(readConfig(words))) << each.name;
        if (each.word != nullptr) {
            words = company;
            words.push_back(std::string("--") + each.name + "=" + each.word);
            EXPECT_TRUE(each.arrived(readConfig(words))) << each.name;
        }
    }
}

TEST(Config, EverySettingIsAKeyOfTheFile) {
    for (const Case& each : cases) {
        // Beside them in the file, since the command line goes before it.
        const std::string own = "\"" + std::string(each.name) + "\":" + each.json;
        std::string text = "{" + own;
        for (const char* other : {R"("module":["a.so"])", R"("tls-certificate":"c")", R"("tls-key":"k")"}) {
            const std::string key = std::string(other).substr(0, std::string(other).find(':'));
            text += own.starts_with(key) ? "" : std::string(",") + other;
        }
        const ConfigFile file(text + "}");
        EXPECT_TRUE(each.arrived(readConfig({"--config", file.name()}))) << text;
    }
}

TEST(Config, EverySettingIsInTheUsageAndTheManual) {
    std::ifstream stream(MANUAL);
    const std::string manual{std::istreambuf_iterator<char>(stream), {}};
    const std::string usage = velt::host::usage();
    std::set<std::string> names{"config", "help", "version"};
    for (const Case& each : cases) {
        names.insert(each.name);
    }
    const auto found = [](const std::string& text, const char* pattern) {
        const std::regex expression(pattern);
        std::set<std::string> all;
        for (auto i = std::sregex_iterator(text.begin(), text.end(), expression); i != std::sregex_iterator();
             ++i) {
            all.insert((*i)[1].str());
        }
        return all;
    };
    EXPECT_EQ(found(usage, "--([a-z-]+)"), names);
    EXPECT_EQ(found(manual, "Fl -([a-z-]+)"), names);
}

TEST(Config, TheDefaultsAreTheDocumentedLimits) {
    const Config config = readConfig({"--module", "a.so"});
    EXPECT_EQ(config.limits.body, 1048576U);
    EXPECT_EQ(config.limits.head, 16384U);
    EXPECT_EQ(config.limits.headTime, seconds(10));
    EXPECT_EQ(config.limits.bodyTime, seconds(30));
    EXPECT_EQ(config.limits.idleTime, seconds(30));
    EXPECT_EQ(config.limits.writeTime, seconds(20));
    EXPECT_EQ(config.stopTime, seconds(60));
    EXPECT_EQ(config.limits.connections, 1000U);
    EXPECT_EQ(config.ioThreads, 2U);
    EXPECT_EQ(config.workers, 4U);
    EXPECT_EQ(config.adminGroup, "velt-admin");
    EXPECT_EQ(config.socketPath(), "/run/velt/veltd.sock");
    EXPECT_EQ(config.tokenFile(), "/var/lib/velt/tokens.json");
    EXPECT_TRUE(config.listen.empty());
    EXPECT_FALSE(config.allowRemote);
}

TEST(Config, TheCommandLineGoesBeforeTheFile) {
    const ConfigFile file(R"({"module": ["a.so"], "listen": ["127.0.0.1:1", "[::1]:1"], "max-body": 4096,
        "workers": 7, "allow-remote": false})");
    const Config fromFile = readConfig({"--config", file.name()});
    EXPECT_EQ(fromFile.listen.size(), 2U);
    EXPECT_EQ(fromFile.limits.body, 4096U);
    EXPECT_FALSE(fromFile.allowRemote);
    const Config both = readConfig({"--listen", "127.0.0.1:2", "--config", file.name(), "--max-body=1024"});
    EXPECT_EQ(both.listen, std::vector<std::string>{"127.0.0.1:2"});
    EXPECT_EQ(both.limits.body, 1024U);
    EXPECT_EQ(both.workers, 7U);
    const Config several = readConfig({"--config", file.name(), "--module", "b.so", "--module=c.so"});
    EXPECT_EQ(several.modules, (std::vector<std::filesystem::path>{"b.so", "c.so"}));
}

TEST(Config, AnOptionThatIsWrongIsNamed) {
    EXPECT_EQ(refusal({}), "No module is given: use --module FILE.");
    EXPECT_EQ(refusal({"--module"}), "--module needs a value.");
    EXPECT_EQ(refusal({"--module="}), "--module takes a non-empty string, not \"\".");
    for (const char* word : {"module.so", "--nonsense", "--", "-module", "", "--max_body=1", "--Module=a"}) {
        EXPECT_EQ(refusal({word}), "\"" + std::string(word) + "\" is not an option. --help lists them.");
    }
    EXPECT_EQ(refusal({"--allow-remote=yes"}), "--allow-remote takes no value.");
    EXPECT_EQ(refusal({"--help=x"}), "--help takes no value.");
    for (const char* value :
         {"many", "1023", "-1", "1073741825", "99999999999999999999", "1e4", " 2048", "2048 "}) {
        EXPECT_EQ(refusal({"--max-body", value}),
                  "--max-body takes a number from 1024 to 1073741824, not \"" + std::string(value) + "\".");
    }
    EXPECT_EQ(refusal({"--workers=0"}), "--workers takes a number from 1 to 256, not \"0\".");
    EXPECT_EQ(refusal({"--stop-seconds=-1"}), "--stop-seconds takes a number from 0 to 86400, not \"-1\".");
    EXPECT_EQ(refusal({"--module", "a", "--tls-certificate", "c"}),
              "--tls-certificate and --tls-key must be given together.");
    EXPECT_EQ(refusal({"--module", "a", "--tls-key", "k"}),
              "--tls-certificate and --tls-key must be given together.");
    EXPECT_EQ(refusal({"--module", "a", "--allow-remote"}),
              "--allow-remote needs --tls-certificate and --tls-key.");
}

TEST(Config, AKeyThatIsWrongIsNamed) {
    EXPECT_EQ(refusal({"--config", "/nowhere"}), "Cannot read /nowhere: No such file or directory.");
    EXPECT_EQ(refusal({"--config", "/tmp"}), "Cannot read /tmp: Is a directory.");
    EXPECT_TRUE(refusalOfFile("listen = x").starts_with(" is not a JSON object: line 1, column 1"));
    EXPECT_TRUE(refusalOfFile("[]").starts_with(" is not a JSON object: line 1, column 1"));
    EXPECT_TRUE(
        refusalOfFile("{\n \"workers\": 1,\n \"workers\": 2}").starts_with(" is not a JSON object: line 3"));
    for (const char* key : {"nonsense", "config", "help", "version", "--listen", "max_body"}) {
        const std::string name = "\"" + std::string(key) + "\"";
        EXPECT_EQ(refusalOfFile("{" + name + ": \"x\"}"),
                  ": " + name + " is not a setting. --help lists them.");
    }
    const std::vector<std::pair<std::string, std::string>> wrong{
        {R"("max-body":true)", "a number from 1024 to 1073741824"},
        {R"("max-body":"2048")", "a number from 1024 to 1073741824"},
        {R"("max-body":2048.5)", "a number from 1024 to 1073741824"},
        {R"("max-body":[2048])", "a number from 1024 to 1073741824"},
        {R"("max-body":12)", "a number from 1024 to 1073741824"},
        {R"("print-ready":1)", "true or false"},
        {R"("allow-remote":"yes")", "true or false"},
        {R"("socket":7)", "a string"},
        {R"("socket":["/s"])", "a string"},
        {R"("socket":null)", "a string"},
        {R"("socket":"")", "a non-empty string"},
        {R"("listen":"127.0.0.1:80")", "a list of strings"},
        {R"("listen":["127.0.0.1:80",7])", "a list of strings"},
        {R"("listen":{})", "a list of strings"},
        {R"("host-name":[""])", "a non-empty string"},
    };
    for (const auto& [pair, expected] : wrong) {
        const std::size_t colon = pair.find(':');
        EXPECT_EQ(refusalOfFile("{" + pair + "}"), ": " + pair.substr(0, colon) + " takes " + expected +
                                                       ", not " + pair.substr(colon + 1) + ".");
    }
}

TEST(Config, QuestionsNeedNothingElse) {
    EXPECT_TRUE(readConfig({"--help"}).help);
    EXPECT_TRUE(readConfig({"--version"}).version);
}

TEST(ModuleLog, KeepsTheLinesOfItsThread) {
    const ModuleLog log;
    errno = ENOENT;
    syslog(LOG_ERR, "%s:%d %s", "ftp", 12, "x");
    EXPECT_EQ(errno, ENOENT);
    std::thread([] { syslog(LOG_ERR, "of another thread"); }).join();
    {
        const ModuleLog inner;
        syslog(LOG_ERR, "inner\n");
        EXPECT_EQ(inner.lines(), std::vector<std::string>{"inner"});
    }
    EXPECT_EQ(log.lines(), std::vector<std::string>{"ftp:12 x"});
}

TEST(ModuleLog, TheReasonIsTheLastLineThatTellsOne) {
    using velt::host::reasonIn;
    EXPECT_EQ(reasonIn({}), "");
    EXPECT_EQ(reasonIn({"ftp:7 Port conflict.", "ftp:9 Request: {}"}), "Port conflict.");
    EXPECT_EQ(reasonIn({"first", "no source: here"}), "no source: here");
    EXPECT_EQ(reasonIn({"ftp:9 Request: {}"}), "");
}

TEST(HostLog, NobodyWritesALineOfHisOwn) {
    std::string line;
    velt::host::HostLog log([&line](const std::string& text) { line = text; });
    log.write("id", "a\nb\x1B[0m \xC3\xBC");
    EXPECT_EQ(line, "request=id a\\x0ab\\x1b[0m \xC3\xBC");
    // Terminals obey some characters beyond ASCII, too, and viewers break lines at others.
    const std::string begin = "\xE2\x80"; // apart from the rest, which would turn this line, too
    for (const std::string& commanding : {std::string("\xC2\x85"), std::string("\xC2\x9B"), begin + '\xA8',
                                          begin + '\xAE', std::string("\xE2\x81") + '\xA6'}) {
        log.write("id", "a" + commanding + "b");
        EXPECT_EQ(line.find(commanding), std::string::npos) << line;
    }
}

} // namespace
