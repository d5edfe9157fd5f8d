#include "host/config.h"

#include "host/json_text.h"

#include <charconv>
#include <fstream>
#include <functional>
#include <iterator>
#include <map>

namespace velt::host {

namespace {

using Setter = std::function<void(Config&, const std::string& value)>;

/// A setting, named as on the command line without the dashes.
struct Setting {
    bool takesValue;
    Setter set;
};

std::size_t number(const std::string& name, const std::string& text, std::size_t least) {
    std::size_t value = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, value);
    constexpr std::size_t most = 1'000'000'000;
    if (error != std::errc() || stop != end || value < least || value > most) {
        throw ConfigError("--" + name + " needs a whole number of at least " + std::to_string(least) +
                          ", not \"" + text + "\".");
    }
    return value;
}

Setting limit(const std::string& name, std::size_t HttpLimits::*member, std::size_t least) {
    return {true, [=](Config& config, const std::string& value) {
                config.limits.*member = number(name, value, least);
            }};
}

Setting seconds(const std::string& name, std::chrono::milliseconds HttpLimits::*member) {
    return {true, [=](Config& config, const std::string& value) {
                config.limits.*member = std::chrono::seconds(number(name, value, 1));
            }};
}

Setting threads(const std::string& name, unsigned Config::*member) {
    return {true, [=](Config& config, const std::string& value) {
                config.*member = static_cast<unsigned>(number(name, value, 1));
            }};
}

Setting flag(bool Config::*member) {
    return {false, [=](Config& config, const std::string&) { config.*member = true; }};
}

template<class Member> Setting place(Member Config::*member) {
    return {true, [=](Config& config, const std::string& value) { config.*member = value; }};
}

template<class List> Setting list(List Config::*member) {
    return {true, [=](Config& config, const std::string& value) { (config.*member).emplace_back(value); }};
}

std::map<std::string, Setting> limitSettings() {
    return {
        {"max-head", limit("max-head", &HttpLimits::head, 1024)},
        {"max-body", limit("max-body", &HttpLimits::body, 1024)},
        {"max-connections", limit("max-connections", &HttpLimits::connections, 1)},
        {"head-seconds", seconds("head-seconds", &HttpLimits::headTime)},
        {"body-seconds", seconds("body-seconds", &HttpLimits::bodyTime)},
        {"idle-seconds", seconds("idle-seconds", &HttpLimits::idleTime)},
        {"write-seconds", seconds("write-seconds", &HttpLimits::writeTime)},
        {"io-threads", threads("io-threads", &Config::ioThreads)},
        {"workers", threads("workers", &Config::workers)},
        {"stop-seconds",
         {true,
          [](Config& config, const std::string& value) {
              config.stopTime = std::chrono::seconds(number("stop-seconds", value, 0));
          }}},
    };
}

std::map<std::string, Setting> allSettings() {
    std::map<std::string, Setting> settings = limitSettings();
    settings.insert({
        {"state-root", place(&Config::stateRoot)},
        {"module", list(&Config::modules)},
        {"socket", place(&Config::socket)},
        {"listen", list(&Config::listen)},
        {"host-name", list(&Config::hostNames)},
        {"admin-group", place(&Config::adminGroup)},
        {"allow-remote", flag(&Config::allowRemote)},
        {"print-ready", flag(&Config::printReady)},
        {"help", flag(&Config::help)},
        {"version", flag(&Config::version)},
        {"tls-certificate",
         {true, [](Config& config, const std::string& value) { config.tls.certificate = value; }}},
        {"tls-key", {true, [](Config& config, const std::string& value) { config.tls.key = value; }}},
    });
    return settings;
}

const Setting& settingNamed(const std::string& name) {
    static const std::map<std::string, Setting> settings = allSettings();
    const auto found = settings.find(name);
    if (found == settings.end()) {
        throw ConfigError("There is no setting \"" + name + "\". --help lists them.");
    }
    return found->second;
}

void apply(Config& config, const std::string& name, const Json::Value& value) {
    const Setting& setting = settingNamed(name);
    if (value.isArray()) {
        for (const Json::Value& each : value) {
            apply(config, name, each);
        }
    } else if (setting.takesValue) {
        if (!value.isString() && !value.isIntegral()) {
            throw ConfigError("\"" + name + "\" in the configuration file needs a text or a number.");
        }
        setting.set(config, value.asString());
    } else if (value.isBool()) {
        if (value.asBool()) {
            setting.set(config, "");
        }
    } else {
        throw ConfigError("\"" + name + "\" in the configuration file is true or false.");
    }
}

void readFile(Config& config, const std::string& file) {
    std::ifstream stream(file);
    const std::string text{std::istreambuf_iterator<char>(stream), {}};
    if (!stream.is_open()) {
        throw ConfigError("The configuration file " + file + " cannot be read.");
    }
    const ParsedObject parsed = parseObject(text);
    if (!parsed.error.empty()) {
        throw ConfigError("The configuration file " + file + " is no JSON object: " + parsed.error + ".");
    }
    for (const std::string& name : parsed.value.getMemberNames()) {
        apply(config, name, parsed.value[name]);
    }
}

/// Lists in the file are replaced, not lengthened, by those of the command line: a host that listens where
/// the administrator did not ask for is worse than one that does not.
void forgetLists(Config& config, const std::string& name) {
    if (name == "listen") {
        config.listen.clear();
    } else if (name == "module") {
        config.modules.clear();
    } else if (name == "host-name") {
        config.hostNames.clear();
    }
}

void check(const Config& config) {
    if (config.help || config.version) {
        return;
    }
    if (config.modules.empty()) {
        throw ConfigError("Name at least one module to load: --module FILE.");
    }
    if (config.tls.certificate.empty() != config.tls.key.empty()) {
        throw ConfigError("A TLS certificate needs its key, and a key its certificate.");
    }
    if (config.allowRemote && config.tls.certificate.empty()) {
        throw ConfigError("--allow-remote needs --tls-certificate and --tls-key.");
    }
}

} // namespace

std::filesystem::path Config::socketPath() const {
    return socket.empty() ? stateRoot / "run/velt/veltd.sock" : socket;
}

std::filesystem::path Config::tokenFile() const {
    return stateRoot / "var/lib/velt/tokens.json";
}

Config readConfig(const std::vector<std::string>& words) {
    Config config;
    std::vector<std::pair<std::string, std::string>> given;
    for (std::size_t i = 0; i < words.size(); ++i) {
        if (!words[i].starts_with("--")) {
            throw ConfigError("\"" + words[i] + "\" is no option. --help lists them.");
        }
        const std::size_t equals = words[i].find('=');
        const std::string name = words[i].substr(2, equals == std::string::npos ? equals : equals - 2);
        std::string value;
        if (name == "config" || settingNamed(name).takesValue) {
            if (equals == std::string::npos && ++i == words.size()) {
                throw ConfigError("--" + name + " needs a value.");
            }
            value = equals == std::string::npos ? words[i] : words[i].substr(equals + 1);
        }
        if (name == "config") {
            readFile(config, value);
        } else {
            given.emplace_back(name, value);
        }
    }
    for (const auto& [name, value] : given) {
        forgetLists(config, name);
    }
    for (const auto& [name, value] : given) {
        settingNamed(name).set(config, value);
    }
    check(config);
    return config;
}

const char* usage() {
    return "Usage: veltd --module FILE [OPTION]...\n"
           "Serves the modules' APIs over HTTP.\n\n"
           "  --config FILE            read settings from a JSON object, named as the options here\n"
           "  --module FILE            load this module; may be given several times\n"
           "  --state-root DIR         where all state lies (/)\n"
           "  --socket PATH            the Unix socket (run/velt/veltd.sock below the state root)\n"
           "  --listen ADDRESS:PORT    listen on TCP, too; may be given several times\n"
           "  --allow-remote           permit addresses that other machines reach; needs TLS\n"
           "  --tls-certificate FILE   PEM file of the certificate with its chain\n"
           "  --tls-key FILE           PEM file of its private key\n"
           "  --host-name NAME         a name that clients use for this host; may be given several times\n"
           "  --admin-group NAME       the group whose members may use the Unix socket (velt-admin)\n"
           "  --max-head BYTES         (16384)     --head-seconds N   (10)\n"
           "  --max-body BYTES         (1048576)   --body-seconds N   (30)\n"
           "  --max-connections N      (1000)      --idle-seconds N   (30)\n"
           "  --io-threads N           (2)         --write-seconds N  (20)\n"
           "  --workers N              (4)         --stop-seconds N   (60)\n"
           "  --print-ready            print one line of JSON when it listens, with the real ports\n"
           "  --help, --version\n";
}

} // namespace velt::host
