// Texts broken at random, the same ones in each run.
#ifndef VELT_TESTS_STANDALONE_SUPPORT_TEXT_BREAKER_H
#define VELT_TESTS_STANDALONE_SUPPORT_TEXT_BREAKER_H

#include <random>
#include <string>

namespace velt::test {

class TextBreaker {
public:
    std::string broken(std::string text) {
        for (std::size_t i = 0, count = 1 + pick(3); i < count && !text.empty(); i++) {
            const auto at = pick(text.size());
            switch (pick(5)) {
            case 0:
                text[at] = static_cast<char>(pick(256));
                break;
            case 1:
                text.erase(at, 1 + pick(8));
                break;
            case 2:
                text.insert(at, text, pick(text.size()), 1 + pick(16));
                break;
            case 3:
                text.resize(at);
                break;
            default:
                text.insert(at, std::string(1 + pick(40), "[{\"\0\n/.:9"[pick(10)]));
            }
        }
        return text;
    }

private:
    std::size_t pick(std::size_t below) {
        return std::uniform_int_distribution<std::size_t>(0, below - 1)(random_);
    }

    std::mt19937 random_{20};
};

} // namespace velt::test

#endif
