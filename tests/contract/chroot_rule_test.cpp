#include "tests/contract/contract_test.h"

#include <array>
#include <tuple>

namespace contract {
namespace {

struct Rule {
    bool isUser;
    std::string name;
    std::string path;

    bool operator==(const Rule&) const = default;
};

void PrintTo(const Rule& rule, std::ostream* out) {
    *out << (rule.isUser ? "user " : "group ") << rule.name << " in " << rule.path;
}

class ChrootRuleContract : public ContractTest {
protected:
    static std::string format(bool isUser, int id, const std::string& path) {
        std::array<char, 512> line{};
        line.fill('?');
        EXPECT_GE(VELTFTPChrootRuleFormat(line.data(), int{line.size()}, isUser ? 1 : 0, id, path.c_str()), 0)
            << lastError();
        return line.data();
    }

    static Rule parse(const std::string& line) {
        int isUser = -7;
        std::array<char, 64> name{};
        std::array<char, 256> path{};
        EXPECT_GE(VELTFTPChrootRuleParseToName(line.c_str(), &isUser, name.data(), int{name.size()},
                                               path.data(), int{path.size()}),
                  0)
            << lastError() << ": " << line;
        return {isUser != 0, name.data(), path.data()};
    }

    static int parseInto(const std::string& line, int nameSize, int pathSize) {
        int isUser = 0;
        std::array<char, 64> name{};
        std::array<char, 64> path{};
        return VELTFTPChrootRuleParseToName(line.c_str(), &isUser, name.data(), nameSize, path.data(),
                                            pathSize);
    }

    static void save(const Names& lines) {
        ASSERT_GE(VELTFTPChrootRuleSave(List(lines).get()), 0) << lastError();
    }

    static Names stored() {
        List list;
        EXPECT_GE(VELTFTPChrootRuleEnum(list.address()), 0) << lastError();
        return list.names();
    }
};

TEST_F(ChrootRuleContract, ThereIsNoneAtFirst) {
    EXPECT_EQ(stored(), Names());
}

TEST_F(ChrootRuleContract, AFormattedSavedAndListedRuleIsReadBack) {
    save({format(true, 1000, "/photos"), format(false, 50, "/photos/below it"), format(true, 1001, "/home"),
          format(false, 100, "/home")});
    std::vector<Rule> read;
    for (const std::string& line : stored()) {
        read.push_back(parse(line));
    }
    EXPECT_EQ(read, (std::vector<Rule>{{true, "ann", "/photos"},
                                       {false, "staff", "/photos/below it"},
                                       {true, "ben", "/home"},
                                       {false, "users", "/home"}}));
}

TEST_F(ChrootRuleContract, PathsMayHaveWhatFoldersMayHave) {
    for (const char* path : {"/photos/a:b", "/photos/ä", "/photos/%{env:HOME}", "/photos/-r", "/photos/#"}) {
        save({format(true, 1000, path)});
        ASSERT_EQ(stored().size(), 1U);
        EXPECT_EQ(parse(stored()[0]), (Rule{true, "ann", path}));
    }
}

TEST_F(ChrootRuleContract, SavingReplacesAllAndKeepsTheOrder) {
    const std::string ann = format(true, 1000, "/photos");
    const std::string ben = format(true, 1001, "/photos");
    const std::string staff = format(false, 50, "/home");
    save({staff, ben, ann});
    EXPECT_EQ(stored(), (Names{staff, ben, ann}));
    save({ann, staff});
    EXPECT_EQ(stored(), (Names{ann, staff}));
    save({ann, ann});
    EXPECT_EQ(stored(), (Names{ann, ann}));
    save({});
    EXPECT_EQ(stored(), Names());
}

TEST_F(ChrootRuleContract, ALineThatIsNoRuleIsNotRead) {
    for (const char* line : {"", "nonsense", ":", "::", "ann:/photos"}) {
        EXPECT_LT(parseInto(line, 64, 64), 0) << line;
    }
    EXPECT_LT(parseInto(format(true, 4000, "/photos"), 64, 64), 0) << "nobody has this number";
    EXPECT_LT(parseInto(format(false, 1000, "/photos"), 64, 64), 0) << "a user's number is no group's";
}

TEST_F(ChrootRuleContract, TheSizesCountTheNul) {
    const std::string line = format(true, 1000, "/photos");
    EXPECT_GE(parseInto(line, 4, 8), 0) << lastError();
    EXPECT_LT(parseInto(line, 3, 8), 0);
    EXPECT_LT(parseInto(line, 4, 7), 0);
    std::array<char, 64> buffer{};
    const int length = static_cast<int>(line.size());
    EXPECT_GE(VELTFTPChrootRuleFormat(buffer.data(), length + 1, 1, 1000, "/photos"), 0) << lastError();
    EXPECT_EQ(buffer.data(), line);
    EXPECT_LT(VELTFTPChrootRuleFormat(buffer.data(), length, 1, 1000, "/photos"), 0);
}

} // namespace
} // namespace contract
