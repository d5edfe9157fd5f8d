#include "platform/share.h"

#include "base/plain_text.h"
#include "standalone/contract/boundary.h"
#include "standalone/shares/share_access.h"
#include "standalone/shares/share_store.h"

#include <algorithm>
#include <memory>

namespace velt {
namespace {

struct LoadedShare : VELT_SHARE {
    explicit LoadedShare(ShareEntry share) : VELT_SHARE{}, entry(std::move(share)) {
        name = entry.name.c_str();
        comment = entry.comment.c_str();
        path = entry.path.c_str();
    }
    ShareEntry entry;
};

Result<> find(const char* name, VELT_SHARE** out) {
    if (name == nullptr || out == nullptr) {
        return Error(ErrorNumber::invalid, "A share look-up needs a name.");
    }
    VELT_ASSIGN_OR_RETURN(auto shares, loadShares());
    const auto found = std::ranges::find(shares, name, &ShareEntry::name);
    if (found == shares.end()) {
        return Error(ErrorNumber::notFound, "There is no share \"" + plainText(name, 120) + "\".");
    }
    *out = std::make_unique<LoadedShare>(std::move(*found)).release();
    return {};
}

/// The code in which the contract answers.
std::int32_t codeOf(std::optional<Access> access) {
    if (!access) {
        return 0;
    }
    switch (*access) {
    case Access::write:
        return 1;
    case Access::read:
        return 2;
    case Access::none:
        break;
    }
    return 4;
}

Result<> tellPrivilege(const char* account, const VELT_SHARE* share, VELT_SHARE_PRIV* out) {
    if (account == nullptr || share == nullptr || out == nullptr) {
        return Error(ErrorNumber::invalid, "A privilege look-up needs an account and a share.");
    }
    VELT_ASSIGN_OR_RETURN(const auto access,
                          accessOf(account, static_cast<const LoadedShare*>(share)->entry));
    *out = {{0, 0}, codeOf(access)};
    return {};
}

} // namespace
} // namespace velt

int VELTShareGet(const char* name, VELT_SHARE** out) {
    return velt::atBoundary([&] { return velt::find(name, out); });
}

int VELTShareUGPrivGetLocal(const char* account, VELT_SHARE* share, VELT_SHARE_PRIV* out) {
    return velt::atBoundary([&] { return velt::tellPrivilege(account, share, out); });
}

void VELTShareFree(VELT_SHARE* share) {
    const std::unique_ptr<velt::LoadedShare> owner(static_cast<velt::LoadedShare*>(share));
}
