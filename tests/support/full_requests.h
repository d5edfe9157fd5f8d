// One request for each row of the table that goes through as many platform calls as the row has, with the
// state it needs.
#ifndef VELT_TESTS_SUPPORT_FULL_REQUESTS_H
#define VELT_TESTS_SUPPORT_FULL_REQUESTS_H

#include "platform/webapi.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <gtest/gtest.h>

#include <ostream>
#include <string>
#include <vector>

struct FullRequest {
    const char* name; ///< the entry function, and what is special
    VELT::APIEntryFunction entry;
    void (*prepare)(fake::Platform&);
    std::string params;
};

const std::vector<FullRequest>& fullRequests();

/// How GoogleTest shows one in a test's name and in messages.
std::ostream& operator<<(std::ostream& stream, const FullRequest& request);
std::string testNameOf(const testing::TestParamInfo<FullRequest>& parameter);

#endif
