#include "tests/contract/contract_test.h"

#include "tests/contract/platform_setup.h"

#include <cstring>

namespace contract {

List::List(const Names& names) : list_(VLIBCSzListAlloc(4)) {
    for (const std::string& name : names) {
        EXPECT_GE(VLIBCSzListPush(&list_, name.c_str()), 0);
    }
}

Names List::names() const {
    Names names;
    for (int i = 0; i < list_->count; ++i) {
        const char* text = VLIBCSzListGet(list_, i);
        EXPECT_NE(text, nullptr) << i;
        names.emplace_back(text != nullptr ? text : "(null)");
    }
    return names;
}

std::set<std::string> List::nameSet() const {
    const Names all = names();
    std::set<std::string> different(all.begin(), all.end());
    EXPECT_EQ(all.size(), different.size()) << ::testing::PrintToString(all);
    return different;
}

void ContractTest::SetUp() {
    prepare({{{"ann", "Ann Example", 1000},
              {"ben", "", 1001},
              {"bea", "Bea", 1002},
              {"ftp", "File transfer", 200, false}},
             {{"users", 100}, {"staff", 50}},
             {{"photos", "All of them", true, true},
              {"private", "Nobody's", true, false},
              {"hidden", "", false, true}}});
}

void ContractTest::TearDown() {
    finish();
}

std::string ContractTest::lastError() {
    return std::to_string(VLIBCErrGet()) + " at " + VLIBCErrorGetFile() + ":" +
           std::to_string(VLIBCErrorGetLine());
}

_tag_VELT_FTP_CONF_ ContractTest::ftpRecord() {
    _tag_VELT_FTP_CONF_ record;
    std::memset(&record, '?', sizeof(record));
    EXPECT_GE(VELTFTPConfGet(&record), 0) << lastError();
    return record;
}

} // namespace contract
