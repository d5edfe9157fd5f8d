#include "platform/share.h"

#include "base/plain_text.h"
#include "ftp/ftp_library.h"
#include "platform/core.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"
#include "standalone/shares/share_privilege.h"
#include "standalone/shares/share_store.h"

#include <algorithm>
#include <memory>
#include <string>

namespace {

// The selection under which the module lists what is offered to FTP; it asks for no other.
constexpr int offeredToFtp = 0x207;

struct LoadedShare : VELT_SHARE {
    explicit LoadedShare(velt::ShareEntry share) : VELT_SHARE{}, entry(std::move(share)) {
        name = entry.name.c_str();
        comment = entry.comment.c_str();
        path = entry.path.c_str();
    }
    velt::ShareEntry entry;
};

} // namespace

int VELTShareGet(const char* name, VELT_SHARE** out) {
    return velt::atBoundary([&] {
        if (name == nullptr || out == nullptr) {
            return velt::fail(velt::ErrorNumber::invalid, "A share look-up needs a name.");
        }
        std::optional<std::vector<velt::ShareEntry>> shares = velt::allShares();
        if (!shares) {
            return -1;
        }
        const auto found = std::find_if(shares->begin(), shares->end(),
                                        [name](const velt::ShareEntry& share) { return share.name == name; });
        if (found == shares->end()) {
            return velt::fail(velt::ErrorNumber::notFound,
                              "There is no share \"" + velt::plainText(name, 120) + "\".");
        }
        *out = std::make_unique<LoadedShare>(std::move(*found)).release();
        return 0;
    });
}

int VELTShareUGPrivGetLocal(const char* account, VELT_SHARE* share, VELT_SHARE_PRIV* out) {
    return velt::atBoundary([&] {
        if (account == nullptr || share == nullptr || out == nullptr) {
            return velt::fail(velt::ErrorNumber::invalid,
                              "A privilege look-up needs an account and a share.");
        }
        const std::optional<velt::SharePrivilege> privilege =
            velt::privilegeOn(static_cast<const LoadedShare*>(share)->entry, account);
        if (!privilege) {
            return -1;
        }
        *out = {{0, 0}, static_cast<std::int32_t>(*privilege)};
        return 0;
    });
}

void VELTShareFree(VELT_SHARE* share) {
    const std::unique_ptr<LoadedShare> owner(static_cast<LoadedShare*>(share));
}

int VELTFTPShareEnum(VLIBCSzList** list, int selection) {
    return velt::atBoundary([&] {
        if (list == nullptr || *list == nullptr) {
            return velt::fail(velt::ErrorNumber::invalid, "A listing of shares needs a list to fill.");
        }
        if (selection != offeredToFtp) {
            return velt::fail(velt::ErrorNumber::invalid,
                              "Only the shares that are offered to FTP can be listed.");
        }
        const std::optional<std::vector<velt::ShareEntry>> shares = velt::allShares();
        if (!shares) {
            return -1;
        }
        for (const velt::ShareEntry& share : *shares) {
            if (share.offeredToFtp && VLIBCSzListPush(list, share.name.c_str()) < 0) {
                return -1;
            }
        }
        return 0;
    });
}
