// The administrator log and the system event bus: that they take what the module hands them.
#include "platform/adminlog.h"
#include "platform/sysevent.h"
#include "tests/contract/contract_test.h"

namespace contract {
namespace {

class AnnouncementContract : public ContractTest {};

TEST_F(AnnouncementContract, EachEventIsLogged) {
    for (unsigned event = 0x11B00001; event <= 0x11B00030; ++event) {
        EXPECT_GE(VELTLogSet1(2, 1, event, "21", "2121", "", ""), 0) << event << ": " << lastError();
    }
    EXPECT_GE(VELTLogSet1(1, 1, 0x11B00001, "", "", "", ""), 0) << lastError();
}

TEST_F(AnnouncementContract, AnyTextIsLogged) {
    const std::string longText(10000, 'x');
    for (const char* text : {"a\nb", "%s%n%1", "\xff\xfe", "'; DROP TABLE entries; --", longText.c_str()}) {
        EXPECT_GE(VELTLogSet1(2, 1, 0x11B00012, text, text, text, text), 0) << lastError();
    }
}

TEST_F(AnnouncementContract, AnEventIsAnnouncedWithAndWithoutEntries) {
    VLIBCSzHash* map = VLIBCSzHashAlloc(1024);
    ASSERT_NE(map, nullptr);
    EXPECT_GE(VLIBSyseventEmit("velt.service.start", map, 1), 0) << lastError();
    EXPECT_GE(VLIBCSzHashSetValue(&map, "SERVICE", "a\nb \xff"), 0);
    EXPECT_GE(VLIBSyseventEmit("velt.service.stop", map, 1), 0) << lastError();
    VLIBCSzHashFree(map);
}

} // namespace
} // namespace contract
