#include "tests/model/comparison.h"

#include <algorithm>
#include <functional>

namespace velt::model {
namespace {

std::string describe(const Node* node) {
    if (node == nullptr) {
        return "nothing";
    }
    const char* const kind = node->kind == Kind::folder ? "a folder"
                             : node->kind == Kind::file ? "a file"
                                                        : "a link";
    const std::string digits{static_cast<char>('0' + (node->mode >> 6)),
                             static_cast<char>('0' + ((node->mode >> 3) & 7)),
                             static_cast<char>('0' + (node->mode & 7))};
    return std::string(kind) + " of " + std::to_string(node->owner) + " with mode " + digits +
           (node->text.empty() ? "" : " and \"" + node->text + "\"");
}

// What was just made has no number in the model, and the server chooses its mode.
bool isSame(const Node& expected, const Node& found) {
    const bool known = expected.id != 0;
    return expected.kind == found.kind && expected.owner == found.owner && expected.text == found.text &&
           (!known ||
            (expected.id == found.id && expected.mode == found.mode && expected.group == found.group));
}

/// Calls `tell` with each path at which the trees differ, until it returns a text.
std::string eachDifference(const Tree& one, const Tree& other,
                           const std::function<std::string(const std::string&)>& tell) {
    std::set<std::string> paths;
    for (const auto& tree : {&one, &other}) {
        for (const auto& [path, node] : tree->nodes) {
            const Node* first = one.at(path);
            const Node* second = other.at(path);
            if (first == nullptr || second == nullptr || !isSame(*first, *second)) {
                paths.insert(path);
            }
        }
    }
    for (const std::string& path : paths) {
        if (std::string text = tell(path); !text.empty()) {
            return text;
        }
    }
    return "";
}

std::string joined(const std::set<std::string>& names) {
    std::string text;
    for (const std::string& name : names) {
        text += (text.empty() ? "" : " ") + name;
    }
    return "(" + text + ")";
}

// Servers leave out links that lead nowhere, and names that begin with a dot.
bool isListingOf(const std::set<std::string>& names, const std::set<std::string>& expected,
                 const Tree& tree) {
    const auto isLink = [&](const std::string& name) {
        return std::ranges::any_of(tree.nodes, [&](const auto& entry) {
            return entry.second.kind == Kind::link && nameOf(entry.first) == name;
        });
    };
    return std::ranges::includes(expected, names) && std::ranges::all_of(expected, [&](const auto& name) {
               return names.contains(name) || isLink(name) || name.starts_with('.');
           });
}

std::string wrongAnswer(const Tree& before, const Expectation& expected, const Outcome& outcome) {
    const bool showsNothing = outcome.names && outcome.names->empty();
    if (expected.verdict == Verdict::refused) {
        return outcome.allowed && !showsNothing ? "was allowed, and must be refused" : "";
    }
    if (!outcome.allowed) {
        return "was refused, and must be allowed";
    }
    if (outcome.content && *outcome.content != expected.content) {
        return "read \"" + *outcome.content + "\" instead of \"" + expected.content + "\"";
    }
    if (outcome.names && !isListingOf(*outcome.names, expected.names, before)) {
        return "showed " + joined(*outcome.names) + " instead of " + joined(expected.names);
    }
    return "";
}

} // namespace

std::string disagreement(const Tree& before, const Expectation& expected, const Outcome& outcome) {
    if (expected.verdict == Verdict::undecided) {
        return "";
    }
    if (std::string answer = wrongAnswer(before, expected, outcome); !answer.empty()) {
        return answer;
    }
    const Tree& after = expected.after ? *expected.after : before;
    return eachDifference(after, outcome.after, [&](const std::string& path) {
        return "left " + describe(outcome.after.at(path)) + " at " + path + " instead of " +
               describe(after.at(path));
    });
}

std::string breach(const Tree& before, const View& view, std::uint64_t open, const Outcome& outcome) {
    // By any of its names; what is open stays open.
    const auto may = [&](const Tree& tree, const std::string& path, Access access) {
        const Node* const node = tree.at(path);
        return (open != 0 && node != nullptr && node->id == open) ||
               std::ranges::any_of(tree.namesOf(path), [&](const std::string& name) {
                   return mayReach(tree, view, name, access);
               });
    };
    if (outcome.content && !outcome.content->empty()) {
        const bool known = std::ranges::any_of(before.nodes, [&](const auto& entry) {
            return entry.second.kind == Kind::file && entry.second.text == *outcome.content &&
                   may(before, entry.first, Access::read);
        });
        if (!known) {
            return "BREACH: read \"" + *outcome.content + "\"";
        }
    }
    return eachDifference(before, outcome.after, [&](const std::string& path) -> std::string {
        const bool wasThere = before.at(path) != nullptr;
        return may(wasThere ? before : outcome.after, path, Access::write) ? "" : "BREACH: changed " + path;
    });
}

} // namespace velt::model
