// The share library.

#include "platform/share.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/handles.h"
#include "tests/support/fake_platform/text.h"

using fake::arguments;
using fake::Platform;
using fake::ShareBlock;
using fake::Verbatim;

namespace {

constexpr int32_t reservedWord = 0x5A;

VELT_SHARE* makeShare(const std::string& name, const fake::ShareState& state) {
    ShareBlock& block = Platform::instance().handles().create<ShareBlock>();
    block.set(name, state.comment, state.path);
    block.privilege = state.privilege;
    return &block.record;
}

} // namespace

int VELTShareGet(const char* name, VELT_SHARE** out) {
    auto& platform = Platform::instance();
    const Verbatim standing{platform.handles().nameOf(*out)};
    const auto failure = platform.enter("VELTShareGet", arguments(name, standing));
    const auto share = platform.shares.find(name);
    if (!failure && share != platform.shares.end()) {
        *out = makeShare(name, share->second);
        return 0;
    }
    if (platform.failedShareGetLeavesShare) {
        *out = makeShare(name, {});
    }
    return failure ? *failure : platform.notFound(__FILE__, __LINE__);
}

int VELTShareUGPrivGetLocal(const char* account, VELT_SHARE* share, VELT_SHARE_PRIV* out) {
    auto& platform = Platform::instance();
    const Verbatim name{platform.handles().nameOf(share)};
    if (const auto failure = platform.enter("VELTShareUGPrivGetLocal", arguments(account, name))) {
        return *failure;
    }
    const auto* block = platform.handles().use<ShareBlock>(share, "VELTShareUGPrivGetLocal");
    if (block == nullptr) {
        return -1;
    }
    *out = {{reservedWord, reservedWord}, block->privilege};
    return 0;
}

void VELTShareFree(VELT_SHARE* share) {
    auto& platform = Platform::instance();
    const Verbatim name{platform.handles().nameOf(share)};
    if (!platform.enter("VELTShareFree", arguments(name))) {
        platform.handles().release<ShareBlock>(share, "VELTShareFree");
    }
}
