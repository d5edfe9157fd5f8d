// The fake standalone's report of what a user may see.
#include "tests/host/fake_standalone.h"

namespace velt {

Result<std::string> reportAccess(const std::string& user, const std::string& path) {
    FakeStandalone& fake = FakeStandalone::instance();
    fake.askedAccess = user + " " + path;
    return fake.error == ErrorNumber::none ? Result<std::string>(fake.accessReport)
                                           : Error(fake.error, fake.sentence);
}

} // namespace velt
