#include "host/config.h"

#include "base/file.h"
#include "base/number_text.h"
#include "host/api/token_store.h"
#include "host/base/json.h"

#include <algorithm>
#include <functional>
#include <map>

namespace velt::host {

namespace {

/// A setting has a value that it does not take.
struct BadValue {
    std::string expected;
};

enum class Form {
    flag,   ///< nothing on the command line, true or false in the file
    number, ///< a whole number
    text,
    list, ///< of texts
};

/// A setting, named as on the command line without the dashes.
struct Setting {
    Form form;
    std::function<void(Config&, const std::string& value)> set; ///< throws BadValue
    std::function<void(Config&)> clear{};                       ///< of a list
};

struct Range {
    std::int64_t least;
    std::int64_t most;
};

constexpr Range headBytes{1024, std::int64_t{1} << 20U};
constexpr Range bodyBytes{1024, std::int64_t{1} << 30U};
constexpr Range connectionCount{1, 100'000};
constexpr Range someSeconds{1, 86'400};
constexpr Range noneOrSomeSeconds{0, 86'400};
constexpr Range ioThreadCount{1, 64};
constexpr Range workerCount{1, 256};

std::size_t number(const std::string& text, Range range) {
    const auto value = parseNumber(text);
    if (!value || *value < range.least || *value > range.most) {
        throw BadValue{numberText(range.least, range.most)};
    }
    return static_cast<std::size_t>(*value);
}

const std::string& notEmpty(const std::string& text) {
    if (text.empty()) {
        throw BadValue{"a non-empty string"};
    }
    return text;
}

/// Where a setting is kept, by the members that lead there.
template<class... Members> auto& placeOf(Config& config, Members... members) {
    return (config.*....*members);
}

template<class... Members> Setting count(Range range, Members... members) {
    return {Form::number, [=](Config& config, const std::string& value) {
                auto& place = placeOf(config, members...);
                place = static_cast<std::remove_reference_t<decltype(place)>>(number(value, range));
            }};
}

template<class... Members> Setting seconds(Range range, Members... members) {
    return {Form::number, [=](Config& config, const std::string& value) {
                placeOf(config, members...) = std::chrono::seconds(number(value, range));
            }};
}

template<class... Members> Setting text(Members... members) {
    return {Form::text,
            [=](Config& config, const std::string& value) { placeOf(config, members...) = notEmpty(value); }};
}

template<class List> Setting list(List Config::*member) {
    return {Form::list,
            [=](Config& config, const std::string& value) { (config.*member).emplace_back(notEmpty(value)); },
            [=](Config& config) { (config.*member).clear(); }};
}

Setting flag(bool Config::*member) {
    return {Form::flag, [=](Config& config, const std::string&) { config.*member = true; }};
}

std::map<std::string, Setting> allSettings() {
    return {
        {"admin-group", text(&Config::adminGroup)},
        {"allow-remote", flag(&Config::allowRemote)},
        {"body-seconds", seconds(someSeconds, &Config::limits, &HttpLimits::bodyTime)},
        {"head-seconds", seconds(someSeconds, &Config::limits, &HttpLimits::headTime)},
        {"host-name", list(&Config::hostNames)},
        {"idle-seconds", seconds(someSeconds, &Config::limits, &HttpLimits::idleTime)},
        {"io-threads", count(ioThreadCount, &Config::ioThreads)},
        {"listen", list(&Config::listen)},
        {"max-body", count(bodyBytes, &Config::limits, &HttpLimits::body)},
        {"max-connections", count(connectionCount, &Config::limits, &HttpLimits::connections)},
        {"max-head", count(headBytes, &Config::limits, &HttpLimits::head)},
        {"module", list(&Config::modules)},
        {"print-ready", flag(&Config::printReady)},
        {"socket", text(&Config::socket)},
        {"state-root", text(&Config::stateRoot)},
        {"stop-seconds", seconds(noneOrSomeSeconds, &Config::stopTime)},
        {"tls-certificate", text(&Config::tls, &TlsFiles::certificate)},
        {"tls-key", text(&Config::tls, &TlsFiles::key)},
        {"workers", count(workerCount, &Config::workers)},
        {"write-seconds", seconds(someSeconds, &Config::limits, &HttpLimits::writeTime)},
    };
}

/// Null when there is no such setting.
const Setting* settingNamed(const std::string& name) {
    static const std::map<std::string, Setting> settings = allSettings();
    const auto found = settings.find(name);
    return found == settings.end() ? nullptr : &found->second;
}

/// The values as on the command line. Throws BadValue when the value is not of the setting's form.
std::vector<std::string> valuesOf(const Json::Value& value, Form form) {
    switch (form) {
    case Form::flag:
        if (!value.isBool()) {
            throw BadValue{"true or false"};
        }
        return value.asBool() ? std::vector<std::string>{""} : std::vector<std::string>{};
    case Form::number:
        // The setting refuses what is not a whole number: it knows the range.
        return {value.isIntegral() ? value.asString() : ""};
    case Form::text:
        if (!value.isString()) {
            throw BadValue{"a string"};
        }
        return {value.asString()};
    case Form::list:
        break;
    }
    std::vector<std::string> texts;
    for (const Json::Value& each : value.isArray() ? value : Json::Value(Json::arrayValue)) {
        if (each.isString()) {
            texts.push_back(each.asString());
        }
    }
    if (!value.isArray() || texts.size() != value.size()) {
        throw BadValue{"a list of strings"};
    }
    return texts;
}

void readConfigFile(Config& config, const std::string& file) {
    const auto content = readFile(file);
    if (!content) {
        throw ConfigError(content.error().message);
    }
    const auto settings = parseObject(*content);
    if (!settings) {
        throw ConfigError("The configuration file " + file +
                          " is not a JSON object: " + settings.error().message + ".");
    }
    for (const std::string& name : settings->getMemberNames()) {
        std::string place = "The configuration file " + file;
        place.append(": \"").append(name).append("\"");
        const Setting* const setting = settingNamed(name);
        if (setting == nullptr) {
            throw ConfigError(place + " is not a setting. --help lists them.");
        }
        const Json::Value& value = (*settings)[name];
        try {
            for (const std::string& each : valuesOf(value, setting->form)) {
                setting->set(config, each);
            }
        } catch (const BadValue& bad) {
            throw ConfigError(place + " takes " + bad.expected + ", not " + toJson(value) + ".");
        }
    }
}

void check(const Config& config) {
    if (config.help || config.version) {
        return;
    }
    if (config.modules.empty()) {
        throw ConfigError("No module is given: use --module FILE.");
    }
    if (config.tls.certificate.empty() != config.tls.key.empty()) {
        throw ConfigError("--tls-certificate and --tls-key must be given together.");
    }
    if (config.allowRemote && config.tls.certificate.empty()) {
        throw ConfigError("--allow-remote needs --tls-certificate and --tls-key.");
    }
}

/// An option of the command line.
struct Word {
    std::string name;
    std::string value;
};

/// Splits the words into options. Sets `help` and `version` in the configuration.
std::vector<Word> readWords(const std::vector<std::string>& words, Config& config) {
    std::vector<Word> given;
    for (std::size_t i = 0; i < words.size(); ++i) {
        const std::size_t equals = words[i].find('=');
        const bool hasValue = equals != std::string::npos;
        const std::string name = words[i].substr(0, equals).substr(std::min<std::size_t>(2, words[i].size()));
        const Setting* const setting = settingNamed(name);
        const bool question = name == "help" || name == "version";
        if (!words[i].starts_with("--") || (setting == nullptr && name != "config" && !question)) {
            throw ConfigError("\"" + words[i] + "\" is not an option. --help lists them.");
        }
        config.help = config.help || name == "help";
        config.version = config.version || name == "version";
        const bool takesValue = !question && (setting == nullptr || setting->form != Form::flag);
        if (hasValue && !takesValue) {
            throw ConfigError("--" + name + " takes no value.");
        }
        if (takesValue && !hasValue && ++i == words.size()) {
            throw ConfigError("--" + name + " needs a value.");
        }
        given.push_back({name, hasValue ? words[i].substr(equals + 1) : (takesValue ? words[i] : "")});
    }
    return given;
}

} // namespace

std::filesystem::path Config::socketPath() const {
    return socket.empty() ? stateRoot / "run/velt/veltd.sock" : socket;
}

std::filesystem::path Config::tokenFile() const {
    return stateRoot / tokenFileName;
}

Config readConfig(const std::vector<std::string>& words) {
    Config config;
    const std::vector<Word> given = readWords(words, config);
    for (const Word& word : given) {
        if (word.name == "config") {
            readConfigFile(config, word.value);
        }
    }
    // A list on the command line replaces the file's instead of extending it: a host must not listen where
    // the administrator did not ask it to.
    for (const Word& word : given) {
        if (const Setting* const setting = settingNamed(word.name); setting != nullptr && setting->clear) {
            setting->clear(config);
        }
    }
    for (const Word& word : given) {
        const Setting* const setting = settingNamed(word.name);
        try {
            if (setting != nullptr) {
                setting->set(config, word.value);
            }
        } catch (const BadValue& bad) {
            throw ConfigError("--" + word.name + " takes " + bad.expected + ", not \"" + word.value + "\".");
        }
    }
    check(config);
    return config;
}

const char* usage() {
    return "Usage: veltd --module FILE [OPTION]...\n"
           "       veltd trial start|stop FOLDER\n"
           "Serves the modules' APIs over HTTP.\n\n"
           "  --config FILE            read settings from a JSON object whose keys are these options;\n"
           "                           options given here override it\n"
           "  --module FILE            load this module; may be repeated\n"
           "  --state-root FOLDER      the folder that holds all state (/)\n"
           "  --socket PATH            the Unix socket (run/velt/veltd.sock below the state root)\n"
           "  --listen ADDRESS:PORT    also listen on TCP; may be repeated\n"
           "  --allow-remote           allow addresses that other machines can reach; needs TLS\n"
           "  --tls-certificate FILE   the certificate with its chain, PEM\n"
           "  --tls-key FILE           its private key, PEM\n"
           "  --host-name NAME         a name that clients use for this host; may be repeated\n"
           "  --admin-group NAME       the group whose members may use the Unix socket (velt-admin)\n"
           "  --max-head BYTES         (16384)     --head-seconds N   (10)\n"
           "  --max-body BYTES         (1048576)   --body-seconds N   (30)\n"
           "  --max-connections N      (1000)      --idle-seconds N   (30)\n"
           "  --io-threads N           (2)         --write-seconds N  (20)\n"
           "  --workers N              (4)         --stop-seconds N   (60)\n"
           "  --print-ready            when it listens, print one line of JSON with the real ports\n"
           "  --help, --version\n";
}

} // namespace velt::host
