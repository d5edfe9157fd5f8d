// The frame of the contract tests: one small world, and an owner of a list. These tests and this file know
// the contract alone, so that they say the same of every platform.
#ifndef VELT_TESTS_CONTRACT_CONTRACT_TEST_H
#define VELT_TESTS_CONTRACT_CONTRACT_TEST_H

#include "ftp/ftp_library.h"
#include "platform/core.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

namespace contract {

using Names = std::vector<std::string>;

class List {
public:
    explicit List(const Names& names = {});
    ~List() { VLIBCSzListFree(list_); }
    List(const List&) = delete;
    List& operator=(const List&) = delete;

    VLIBCSzList* get() { return list_; }
    VLIBCSzList** address() { return &list_; }
    Names names() const;
    /// The names without regard to their order; one that stands there twice fails the test.
    std::set<std::string> nameSet() const;

private:
    VLIBCSzList* list_;
};

/// Users ann (1000, "Ann Example"), ben (1001, no description) and bea (1002, "Bea"), the system account ftp
/// (200); groups users (100) and staff (50); shares photos (offered to FTP, reached by "ftp"), private
/// (offered, not reached) and hidden (not offered).
class ContractTest : public ::testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;

    /// The last error in words, for the message of a failed expectation.
    static std::string lastError();

    /// The stored FTP record; one that cannot be read fails the test.
    static _tag_VELT_FTP_CONF_ ftpRecord();
};

} // namespace contract

#endif
