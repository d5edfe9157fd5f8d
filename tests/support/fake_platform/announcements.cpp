// The firewall and the administrator log: operations whose only trace is the journal.

#include "platform/adminlog.h"
#include "platform/firewall.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/text.h"

using fake::arguments;
using fake::Platform;

int VELTFwRuleHup(void) {
    return Platform::instance().enter("VELTFwRuleHup", "").value_or(0);
}

int VELTLogSet1(int category, int level, unsigned event, const char* arg1, const char* arg2, const char* arg3,
                const char* arg4) {
    const auto shown = arguments(category, level, fake::Hex{event}, arg1, arg2, arg3, arg4);
    return Platform::instance().enter("VELTLogSet1", shown).value_or(0);
}
