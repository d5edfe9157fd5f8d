// A process without the platform's symbols cannot load the module: it learns so at once, not at the first
// request.

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <string>

namespace {

TEST(ForeignHost, IsRefusedWithTheNameOfAMissingSymbol) {
    ASSERT_EQ(dlopen(MODULE_PATH, RTLD_NOW | RTLD_LOCAL), nullptr);
    const std::string reason = dlerror();
    EXPECT_NE(reason.find("undefined symbol"), std::string::npos) << reason;
}

} // namespace
