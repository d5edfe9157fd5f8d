#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/handles.h"

#include <algorithm>
#include <iterator>

namespace fake {

_tag_VELT_FTP_CONF_ State::defaultConf() {
    _tag_VELT_FTP_CONF_ conf{};
    std::copy_n("21", 3, conf.portnum);
    return conf;
}

Platform::Platform() : handles_(std::make_unique<HandleTable>()) {}

Platform::~Platform() = default;

Platform& Platform::instance() {
    static Platform platform;
    return platform;
}

void Platform::reset() {
    static_cast<State&>(*this) = State{};
    journal.clear();
    logLines.clear();
    scripts_.clear();
    counts_.clear();
    handles_ = std::make_unique<HandleTable>();
}

void Platform::fail(const std::string& operation, int nth, int result) {
    addScript({operation, nth, result});
}

void Platform::throwFrom(const std::string& operation, int nth) {
    addScript({operation, nth, std::nullopt});
}

void Platform::addScript(Script script) {
    const auto& known = operations();
    if (std::find(known.begin(), known.end(), script.operation) == known.end()) {
        throw std::invalid_argument("no operation is called " + script.operation);
    }
    scripts_.push_back(std::move(script));
}

std::vector<std::string> Platform::unmetScripts() const {
    std::vector<std::string> unmet;
    for (const Script& script : scripts_) {
        if (!script.met) {
            unmet.push_back(script.operation + " #" + std::to_string(script.nth));
        }
    }
    return unmet;
}

int Platform::count(const std::string& operation) const {
    const auto entry = counts_.find(operation);
    return entry == counts_.end() ? 0 : entry->second;
}

std::vector<std::string> Platform::callsTo(const std::string& prefix) const {
    std::vector<std::string> lines;
    std::copy_if(journal.begin(), journal.end(), std::back_inserter(lines),
                 [&](const std::string& line) { return line.starts_with(prefix); });
    return lines;
}

std::string Platform::operationOf(const std::string& journalLine) {
    return journalLine.substr(0, journalLine.find('('));
}

std::vector<std::string> Platform::handleErrors() const {
    return handles_->errors();
}

int Platform::userRecords() const {
    return handles_->made(UserBlock::kind);
}

int Platform::groupRecords() const {
    return handles_->made(GroupBlock::kind);
}

std::optional<int> Platform::enter(const std::string& operation, const std::string& arguments,
                                   bool journalled) {
    const int nth = ++counts_[operation];
    if (journalled) {
        journal.push_back(operation + "(" + arguments + ")");
    }
    for (Script& script : scripts_) {
        if (script.operation != operation || (script.nth != nth && script.nth != everyCall)) {
            continue;
        }
        script.met = true;
        if (!script.result) {
            throw Thrown(operation);
        }
        return script.result;
    }
    return std::nullopt;
}

int Platform::notFound(const char* file, int line) {
    if (lastError.number == 0) {
        constexpr int anyNumber = 0x0200;
        lastError = {anyNumber, file, line};
    }
    return -1;
}

} // namespace fake
