#include "tests/model/step.h"

#include <sstream>

namespace velt::model {

std::string formatStep(const Step& step) {
    std::string line;
    for (const std::string& word : step) {
        line += (line.empty() ? "" : " ") + word;
    }
    return line;
}

Step parseStep(const std::string& line) {
    std::istringstream words(line);
    Step step;
    for (std::string word; words >> word;) {
        step.push_back(word);
    }
    return step;
}

std::pair<std::string, std::string> splitPair(const std::string& word) {
    const auto equals = word.find('=');
    return equals == std::string::npos ? std::pair(word, std::string())
                                       : std::pair(word.substr(0, equals), word.substr(equals + 1));
}

} // namespace velt::model
