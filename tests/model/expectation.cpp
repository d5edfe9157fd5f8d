#include "tests/model/expectation.h"

#include "tests/model/oracle.h"

#include <functional>

namespace velt::model {
namespace {

using Answer = std::function<Expectation(const Oracle&, const Step&)>;

/// Of requests about a path.
const std::map<std::string, Answer>& answers() {
    static const std::map<std::string, Answer> all{
        {"enter", [](const Oracle& oracle, const Step& step) { return oracle.enter(step.at(2)); }},
        {"list", [](const Oracle& oracle, const Step& step) { return oracle.list(step.at(2)); }},
        {"names", [](const Oracle& oracle, const Step& step) { return oracle.list(step.at(2)); }},
        {"facts", [](const Oracle& oracle, const Step& step) { return oracle.list(step.at(2)); }},
        {"read", [](const Oracle& oracle, const Step& step) { return oracle.read(step.at(2)); }},
        {"write", [](const Oracle& oracle, const Step& step) { return oracle.write(step.at(2), false); }},
        {"append", [](const Oracle& oracle, const Step& step) { return oracle.write(step.at(2), true); }},
        {"make", [](const Oracle& oracle, const Step& step) { return oracle.make(step.at(2)); }},
        {"remove", [](const Oracle& oracle, const Step& step) { return oracle.remove(step.at(2)); }},
        {"remove-folder",
         [](const Oracle& oracle, const Step& step) { return oracle.removeFolder(step.at(2)); }},
        {"rename",
         [](const Oracle& oracle, const Step& step) { return oracle.rename(step.at(2), step.at(3)); }},
        {"chmod",
         [](const Oracle& oracle, const Step& step) { return oracle.changeMode(step.at(2), step.at(3)); }},
    };
    return all;
}

/// Of those that SFTP alone has.
const std::map<std::string, Answer>& answersOverSftp() {
    static const std::map<std::string, Answer> all{
        {"replace",
         [](const Oracle& oracle, const Step& step) { return oracle.replace(step.at(2), step.at(3)); }},
        {"twin", [](const Oracle& oracle, const Step& step) { return oracle.twin(step.at(2), step.at(3)); }},
        {"symlink",
         [](const Oracle& oracle, const Step& step) { return oracle.linkTo(step.at(3), step.at(2)); }},
        {"cut", [](const Oracle& oracle, const Step& step) { return oracle.cut(step.at(2)); }},
        {"times", [](const Oracle& oracle, const Step& step) { return oracle.changeTimes(step.at(2)); }},
        {"open-to-read",
         [](const Oracle& oracle, const Step& step) { return oracle.open(step.at(2), false); }},
        {"open-to-write",
         [](const Oracle& oracle, const Step& step) { return oracle.open(step.at(2), true); }},
        {"read-open", [](const Oracle& oracle, const Step&) { return oracle.readOpen(); }},
        {"write-open", [](const Oracle& oracle, const Step&) { return oracle.writeOpen(); }},
        {"chmod-open",
         [](const Oracle& oracle, const Step& step) { return oracle.changeModeOfOpen(step.at(2)); }},
    };
    return all;
}

} // namespace

bool changesNames(const Step& step) {
    static const std::set<std::string> verbs{"make",    "remove", "remove-folder", "rename",
                                             "replace", "twin",   "symlink"};
    return verbs.contains(step.at(0));
}

bool isOfOpenFile(const Step& step) {
    static const std::set<std::string> verbs{"read-open", "write-open", "chmod-open"};
    return verbs.contains(step.at(0));
}

bool isAsked(const Step& step) {
    return answers().contains(step.at(0)) || answersOverSftp().contains(step.at(0));
}

Expectation expect(const Tree& tree, const Asker& asker, const Step& step, const std::string& data) {
    const Oracle oracle(tree, asker, data);
    if (const auto answer = answers().find(step.at(0)); answer != answers().end()) {
        return answer->second(oracle, step);
    }
    return asker.protocol == Protocol::sftp ? answersOverSftp().at(step.at(0))(oracle, step) : Expectation();
}

} // namespace velt::model
