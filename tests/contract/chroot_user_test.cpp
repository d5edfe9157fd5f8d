#include "tests/contract/contract_test.h"

namespace contract {
namespace {

using NameSet = std::set<std::string>;

constexpr int local = 1;
constexpr int domain = 2;
constexpr int ldap = 8;
constexpr int everySource = local | domain | ldap;

constexpr int flagsOfCallers = 16;

class ChrootUserContract : public ContractTest {
protected:
    using Enumerator = decltype(&VELTFTPChrootUserEnum);
    using Change = decltype(&VELTFTPAddChrootUser);

    static NameSet listed(Enumerator enumerate, int source = local, const char* substr = nullptr,
                          const char* ofDomain = nullptr) {
        List list;
        EXPECT_GE(enumerate(list.address(), source, substr, ofDomain), 0) << lastError();
        return list.nameSet();
    }
    static NameSet chrootUsers() { return listed(VELTFTPChrootUserEnum); }
    static NameSet otherUsers() { return listed(VELTFTPNonChrootUserEnum); }

    static void change(Change act, const Names& names) {
        List list(names);
        list.get()->flags = flagsOfCallers;
        ASSERT_GE(act(list.get()), 0) << lastError();
        EXPECT_EQ(list.names(), names) << "the list stays the caller's";
    }
};

TEST_F(ChrootUserContract, NobodyIsOneAtFirst) {
    EXPECT_EQ(chrootUsers(), NameSet());
    EXPECT_EQ(otherUsers(), (NameSet{"ann", "bea", "ben"}));
}

TEST_F(ChrootUserContract, AUserIsOneOrTheOther) {
    change(VELTFTPAddChrootUser, {"ben", "ann"});
    EXPECT_EQ(chrootUsers(), (NameSet{"ann", "ben"}));
    EXPECT_EQ(otherUsers(), NameSet{"bea"});
    change(VELTFTPDeleteChrootUser, {"ben"});
    EXPECT_EQ(chrootUsers(), NameSet{"ann"});
    EXPECT_EQ(otherUsers(), (NameSet{"bea", "ben"}));
}

TEST_F(ChrootUserContract, ANameMayStandTwice) {
    change(VELTFTPAddChrootUser, {"ben", "ann", "ben"});
    EXPECT_EQ(chrootUsers(), (NameSet{"ann", "ben"}));
    change(VELTFTPDeleteChrootUser, {"ann", "ann"});
    EXPECT_EQ(chrootUsers(), NameSet{"ben"});
    EXPECT_EQ(otherUsers(), (NameSet{"ann", "bea"}));
}

TEST_F(ChrootUserContract, WhatIsSoAlreadyStaysSo) {
    change(VELTFTPAddChrootUser, {"ben"});
    change(VELTFTPAddChrootUser, {"ben"});
    change(VELTFTPDeleteChrootUser, {"ann"});
    EXPECT_EQ(chrootUsers(), NameSet{"ben"});
    EXPECT_EQ(otherUsers(), (NameSet{"ann", "bea"}));
}

TEST_F(ChrootUserContract, AnEmptyListChangesNothing) {
    change(VELTFTPAddChrootUser, {"ben"});
    change(VELTFTPAddChrootUser, {});
    change(VELTFTPDeleteChrootUser, {});
    EXPECT_EQ(chrootUsers(), NameSet{"ben"});
}

TEST_F(ChrootUserContract, ListsAreNarrowedToASubstring) {
    change(VELTFTPAddChrootUser, {"ben", "ann"});
    EXPECT_EQ(listed(VELTFTPChrootUserEnum, local, "n"), (NameSet{"ann", "ben"}));
    EXPECT_EQ(listed(VELTFTPChrootUserEnum, local, "en"), NameSet{"ben"});
    EXPECT_EQ(listed(VELTFTPChrootUserEnum, local, "bea"), NameSet());
    EXPECT_EQ(listed(VELTFTPNonChrootUserEnum, local, "be"), NameSet{"bea"});
}

TEST_F(ChrootUserContract, ListsAreNarrowedToTheirSource) {
    change(VELTFTPAddChrootUser, {"ben"});
    for (const int source : {domain, ldap, domain | ldap}) {
        EXPECT_EQ(listed(VELTFTPChrootUserEnum, source), NameSet()) << source;
        EXPECT_EQ(listed(VELTFTPNonChrootUserEnum, source), NameSet()) << source;
    }
    for (const int source : {local | domain, local | ldap, everySource}) {
        EXPECT_EQ(listed(VELTFTPChrootUserEnum, source), NameSet{"ben"}) << source;
        EXPECT_EQ(listed(VELTFTPNonChrootUserEnum, source), (NameSet{"ann", "bea"})) << source;
    }
}

TEST_F(ChrootUserContract, ListsAreNarrowedToADomain) {
    change(VELTFTPAddChrootUser, {"ben"});
    for (const int source : {local, domain, everySource}) {
        EXPECT_EQ(listed(VELTFTPChrootUserEnum, source, nullptr, "ELSEWHERE"), NameSet()) << source;
        EXPECT_EQ(listed(VELTFTPNonChrootUserEnum, source, nullptr, "ELSEWHERE"), NameSet()) << source;
    }
}

TEST_F(ChrootUserContract, TheLetterCaseOfASubstringDoesNotCount) {
    change(VELTFTPAddChrootUser, {"ben"});
    EXPECT_EQ(listed(VELTFTPChrootUserEnum, local, "BE"), NameSet{"ben"});
    EXPECT_EQ(listed(VELTFTPNonChrootUserEnum, local, "eA"), NameSet{"bea"});
}

TEST_F(ChrootUserContract, AnUnknownNameIsRefusedAndChangesNobody) {
    change(VELTFTPAddChrootUser, {"ben"});
    List unknown({"ann", "nobody-like-this"});
    EXPECT_LT(VELTFTPAddChrootUser(unknown.get()), 0);
    List alsoUnknown({"ben", "nobody-like-this"});
    EXPECT_LT(VELTFTPDeleteChrootUser(alsoUnknown.get()), 0);
    EXPECT_EQ(chrootUsers(), NameSet{"ben"});
}

TEST_F(ChrootUserContract, ASystemAccountCanBeOne) {
    change(VELTFTPAddChrootUser, {"ftp"});
    EXPECT_EQ(chrootUsers(), NameSet{"ftp"});
    EXPECT_EQ(otherUsers(), (NameSet{"ann", "bea", "ben"}));
    change(VELTFTPDeleteChrootUser, {"ftp"});
    EXPECT_EQ(chrootUsers(), NameSet());
}

} // namespace
} // namespace contract
