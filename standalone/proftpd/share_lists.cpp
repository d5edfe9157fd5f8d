#include "standalone/proftpd/share_lists.h"

namespace velt {

std::string shareMapText(const std::vector<ShareEntry>& shares) {
    std::string text = "velt-share-map 1\n";
    for (const auto& share : shares) {
        text += share.name + '\t' + share.path + '\n';
    }
    return text;
}

std::string mountListText(const std::vector<ShareEntry>& shares,
                          const std::function<AnonymousAccess(const ShareEntry&)>& anonymousAccess) {
    std::string text;
    for (const auto& share : shares) {
        if (!share.offeredToFtp) {
            continue;
        }
        text += "rw\tusers/" + share.name + '\t' + share.path + '\n';
        const auto access = anonymousAccess(share);
        if (access != AnonymousAccess::none) {
            text += access == AnonymousAccess::write ? "rw" : "ro";
            text += "\tanonymous/" + share.name + '\t' + share.path + '\n';
        }
    }
    return text;
}

} // namespace velt
