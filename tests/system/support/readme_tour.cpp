#include "tests/system/support/readme_tour.h"

#include <array>
#include <regex>
#include <utility>

namespace velt::test {

std::vector<TourStep> stepsOf(const std::string& page) {
    constexpr std::string_view opening = "\n```sh\n";
    constexpr std::string_view middle = "```\n```text\n";
    std::vector<TourStep> steps;
    for (std::size_t at = page.find(opening); at != std::string::npos; at = page.find(opening, at)) {
        at += opening.size();
        const std::size_t commandsEnd = page.find("```", at);
        if (commandsEnd == std::string::npos || page.compare(commandsEnd, middle.size(), middle) != 0) {
            continue;
        }
        const std::size_t begin = commandsEnd + middle.size();
        const std::size_t end = page.find("```", begin);
        steps.push_back({page.substr(at, commandsEnd - at), page.substr(begin, end - begin), begin});
    }
    return steps;
}

std::string withOutputs(const std::string& page, const std::vector<std::string>& outputs) {
    const std::vector<TourStep> steps = stepsOf(page);
    std::string changed = page;
    for (std::size_t i = steps.size(); i-- > 0;) {
        changed.replace(steps[i].begin, steps[i].output.size(), outputs.at(i));
    }
    return changed;
}

std::string masked(const std::string& text) {
    static const std::array<std::pair<std::regex, const char*>, 8> masks{{
        {std::regex(R"(\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d\.\d{3}Z)"), "TIME"},
        {std::regex(R"(\d+ [A-Z][a-z]{2} [ \d]\d \d\d:\d\d)"), "SIZE TIME"},
        {std::regex(R"(\bprocess \d+)"), "process ID"},
        {std::regex(R"(velt_[0-9a-f]{64})"), "TOKEN"},
        {std::regex(R"(\b[0-9a-f]{8}-[0-9a-f]{6}\b)"), "REQUEST"},
        {std::regex(R"(after \d+ ms)"), "after TIME"},
        {std::regex(R"(up for \d+ s)"), "up for TIME"},
        {std::regex("Could(n't| not) connect"), "Could not connect"}, // by the version of curl
    }};
    std::string result = text;
    for (const auto& [pattern, name] : masks) {
        result = std::regex_replace(result, pattern, name);
    }
    return result;
}

} // namespace velt::test
