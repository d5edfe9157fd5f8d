// Texts that try to be more than texts, in every place where a request can put one.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/host_service.h"

#include <algorithm>
#include <filesystem>

namespace velt::test {
namespace {

struct Attempt {
    const char* what;
    std::string json; ///< a JSON text, with its quotes
};

std::string quoted(const std::string& text) {
    return "\"" + text + "\"";
}

const std::vector<Attempt>& attempts() {
    static const std::vector<Attempt> all{
        {"a line of configuration", R"("x\nPort 4444\n")"},
        {"a line end alone", R"("\r\n")"},
        {"a closing quote", R"("x\" Port 4444 \"")"},
        {"a closing section", R"("x\n</IfModule>\nPort 4444")"},
        {"an environment variable", R"("%{env:PATH}")"},
        {"a format", R"("%s%n%d%u")"},
        {"another folder", R"("../../../etc/passwd")"},
        {"an absolute path", R"("/etc/shadow")"},
        {"an option", R"("-oProxyCommand=touch /mnt/injected")"},
        {"a command",
         R"("$(touch /mnt/injected)`touch /mnt/injected`;touch /mnt/injected|touch /mnt/injected")"},
        {"an SQL text", R"("x'; DROP TABLE entry; --")"},
        {"a NUL", R"("alice\u0000/../../etc")"},
        {"control characters", R"("\u001b[31m\u0007\u007f")"},
        {"letters beyond ASCII", "\"gr\xc3\xbc\xc3\x9f \xf0\x9f\x98\x80\""},
        {"a surrogate alone", R"("\ud800")"},
        {"bytes that are no UTF-8", "\"\xff\xfe\xc3(\""},
        {"a long line", quoted(std::string(5000, 'A'))},
        {"a very long line", quoted(std::string(200000, 'B'))},
    };
    return all;
}

/// A place for a text; "@" stands for it.
struct Place {
    const char* what;
    std::string path;
    std::string body;
    const char* method = "POST";
};

const std::vector<Place> places{
    {"external address", "/api/VELT.Core.FileServ.FTP/v3/set",
     R"({"enable_ftp": true, "enable_ftps": false, "use_ext_ip": true, "ext_ip": @})"},
    {"passive range", "/api/VELT.Core.FileServ.FTP/v3/set",
     R"({"enable_ftp": true, "enable_ftps": false, "custom_port_range": true, "custom_port": @})"},
    {"share that is in force", "/api/VELT.Core.FileServ.FTP.Security/v1/set",
     R"({"anonymous": true, "anonymous_chroot": true, "anonymous_chroot_share": @})"},
    {"share that is not", "/api/VELT.Core.FileServ.FTP.Security/v1/set",
     R"({"anonymous_chroot": false, "anonymous_chroot_share": @})"},
    {"user to confine", "/api/VELT.Core.FileServ.FTP.ChrootUser/v1/add", R"({"id": [@]})"},
    {"user to release", "/api/VELT.Core.FileServ.FTP.ChrootUser/v1/delete", R"({"id": [@]})"},
    {"filter of users", "/api/VELT.Core.FileServ.FTP.ChrootUser/v1/list",
     R"({"chroot": false, "substr": @, "domain_name": @, "type": @})"},
    {"name of a rule", "/api/VELT.Core.FileServ.FTP.ChrootUser/v2/save",
     R"({"rules": [{"type": "user", "name": @, "path": "/home"}]})"},
    {"folder of a rule", "/api/VELT.Core.FileServ.FTP.ChrootUser/v2/save",
     R"({"rules": [{"type": "user", "name": "bob", "path": @}]})"},
    {"share folder of a rule", "/api/VELT.Core.FileServ.FTP.ChrootUser/v2/save",
     R"({"rules": [{"type": @, "name": "bob", "path": "/public"}]})"},
    {"name of a token", "/api/tokens", R"({"name": @, "role": "viewer"})"},
    {"role of a token", "/api/tokens", R"({"name": "x", "role": @})"},
    {"external address in a patch", "/api/settings", R"({"ftp": {"use_ext_ip": true, "ext_ip": @}})",
     "PATCH"},
    {"share in a patch", "/api/settings", R"({"security": {"anonymous_chroot_share": @}})", "PATCH"},
    {"rule in a patch", "/api/settings", R"({"chroot_rules": [{"type": "user", "name": @, "path": @}]})",
     "PATCH"},
    {"whole document", "/api/settings", R"({"ftp": {"ext_ip": @}, "sftp": @})", "PUT"},
    {"name of a part", "/api/settings", R"({@: {"ext_ip": @}})", "PATCH"},
    {"state to compare", "/api/diff", R"({"from": @, "to": "now"})"},
};

class HostInjection : public HostService {
protected:
    void SetUp() override {
        HostService::SetUp();
        if (!IsSkipped() && !HasFatalFailure()) {
            done({"ftp", "set", "enable_ftp=on"});
            configuration_ = configuration();
        }
    }

    /// What the running daemons read.
    static std::string configuration() {
        std::string all;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(worldRoot / "run")) {
            const std::string name = entry.path().filename();
            if (name.ends_with(".conf") || name.ends_with("_config")) {
                all += contentsOf(entry.path());
            }
        }
        return all;
    }

    static void expectNoTrace() {
        const std::string now = configuration();
        EXPECT_TRUE(contains(now, "Port ")) << "there is a configuration to look at";
        for (const char* text :
             {"4444", "injected", "etc/passwd", "etc/shadow", "%{env", "DROP TABLE", "AAAA"}) {
            EXPECT_FALSE(contains(now, text)) << text;
        }
        EXPECT_TRUE(isListening(port));
        EXPECT_FALSE(isListening(4444));
    }

    void expectHarmless() const {
        EXPECT_FALSE(std::filesystem::exists("/mnt/injected"));
        EXPECT_EQ(curl("/api/status").status, 200) << "the host lives on";
        EXPECT_EQ(fetchHome(), "alice") << "the daemon lives on";
    }

    std::string configuration_;
};

std::string filled(std::string body, const std::string& text) {
    for (std::size_t at = body.find('@'); at != std::string::npos; at = body.find('@', at + text.size())) {
        body.replace(at, 1, text);
    }
    return body;
}

TEST_F(HostInjection, noTextOfARequestIsMoreThanAText) {
    for (const Place& place : places) {
        for (const Attempt& attempt : attempts()) {
            const testing::ScopedTrace trace(__FILE__, __LINE__,
                                             std::string(place.what) + ": " + attempt.what);
            const HttpResult answer =
                curl(place.path, filled(place.body, attempt.json), {"--request", place.method});
            EXPECT_TRUE(answer.status >= 200 && answer.status < 500 && answer.status != 408) << answer.status;
            if (attempt.what == std::string("bytes that are no UTF-8")) {
                EXPECT_EQ(answer.status, 400) << answer.body;
            }
            if (attempt.what == std::string("a NUL")) {
                EXPECT_EQ(answer.status, 422) << answer.body;
            }
            EXPECT_FALSE(contains(answer.body, "The module is faulty")) << answer.body;
            EXPECT_FALSE(contains(answer.body, "veltd failed")) << answer.body;
            expectNoTrace();
        }
        const testing::ScopedTrace trace(__FILE__, __LINE__, place.what);
        // Whatever of it was stored, the daemon has to take it from now on.
        done({"security", "set", "anonymous_chroot=off", "anonymous_chroot_share="});
        done({"chroot", "rules", "save", "-"}, "[]");
        expectHarmless();
    }
    done({"ftp", "set", "ext_ip=", "use_ext_ip=off", "custom_port_range=off"});
    EXPECT_EQ(configuration(), configuration_);
    expectHarmless();
}

TEST_F(HostInjection, noFilterIsMoreThanAFilter) {
    const auto lines = [](const std::string& text) { return std::ranges::count(text, '\n'); };
    const auto all = lines(done({"log", "--all"}));
    for (const std::string text : {"x' OR '1'='1", "root'; DROP TABLE entry; --", "%", "*", "ro%t", "_oot",
                                   "root\n", "-1", "\xff\xfe", "\""}) {
        for (const char* filter : {"--actor", "--event", "--since", "--before"}) {
            const testing::ScopedTrace trace(__FILE__, __LINE__, filter + (" " + text));
            const ProcessResult result = veltctl({"log", filter + ("=" + text)});
            EXPECT_TRUE(result.exitCode == 0 || result.exitCode == 2 || result.exitCode == 3)
                << result.errors;
            if (result.exitCode == 0) {
                EXPECT_EQ(lines(result.output), 1) << "no entry is meant, but for the heading";
            }
        }
    }
    for (const char* query : {"?limit=1&limit=2%00", "?actor=%", "?actor=%f", "?actor=%ff", "?since=%27",
                              "?x=1", "?event=0x", "?limit=-1", "?limit=1;DROP", "?before=9e9"}) {
        const int status = curl(std::string("/api/log") + query).status;
        EXPECT_EQ(status, 400) << query;
    }
    EXPECT_EQ(lines(done({"log", "--all"})), all);
}

} // namespace
} // namespace velt::test
