#include "standalone/accounts/account_files.h"

#include "base/number_text.h"
#include "base/text.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <limits>

namespace velt {

namespace {

/// A user's or a group's number.
std::optional<std::uint32_t> parseId(std::string_view text) {
    const auto number = parseNumber(text);
    const bool fits = number && *number >= 0 && *number <= std::numeric_limits<std::uint32_t>::max();
    return fits ? std::optional(static_cast<std::uint32_t>(*number)) : std::nullopt;
}

template<std::size_t count>
bool splitFields(std::string_view line, std::array<std::string_view, count>& fields) {
    if (static_cast<std::size_t>(std::count(line.begin(), line.end(), ':')) != count - 1) {
        return false;
    }
    for (std::string_view& field : fields) {
        field = cut(line, ':');
    }
    return true;
}

// Lines that start with these refer to NIS maps and name no account of this file.
bool namesAccount(std::string_view name) {
    return !name.empty() && name[0] != '#' && name[0] != '+' && name[0] != '-';
}

} // namespace

std::string descriptionOf(std::string_view gecos) {
    return std::string(gecos.substr(0, gecos.find(',')));
}

std::vector<UserEntry> parsePasswd(std::string_view text) {
    std::vector<UserEntry> users;
    users.reserve(static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n')) + 1);
    while (!text.empty()) {
        std::array<std::string_view, 7> fields;
        if (!splitFields(cut(text, '\n'), fields) || !namesAccount(fields[0])) {
            continue;
        }
        const auto uid = parseId(fields[2]);
        const auto gid = parseId(fields[3]);
        if (!uid || !gid) {
            continue;
        }
        users.push_back({std::string(fields[0]), *uid, *gid, std::string(fields[5]), descriptionOf(fields[4]),
                         sourceLocal});
    }
    return users;
}

std::vector<LocalGroup> parseGroup(std::string_view text) {
    std::vector<LocalGroup> groups;
    while (!text.empty()) {
        std::array<std::string_view, 4> fields;
        if (!splitFields(cut(text, '\n'), fields) || !namesAccount(fields[0])) {
            continue;
        }
        const auto gid = parseId(fields[2]);
        if (!gid) {
            continue;
        }
        LocalGroup group{{std::string(fields[0]), *gid, sourceLocal}, {}};
        std::string_view members = trimmed(fields[3]);
        while (!members.empty()) {
            if (const std::string_view member = trimmed(cut(members, ',')); !member.empty()) {
                group.members.emplace_back(member);
            }
        }
        groups.push_back(std::move(group));
    }
    return groups;
}

UidRange parseLoginDefs(std::string_view text) {
    UidRange range;
    while (!text.empty()) {
        const std::string_view line = trimmed(cut(text, '\n'));
        const std::size_t end = line.find_first_of(" \t");
        if (end == std::string_view::npos) {
            continue;
        }
        const std::string_view key = line.substr(0, end);
        const auto number = parseId(trimmed(line.substr(end)));
        if (number && key == "UID_MIN") {
            range.first = *number;
        } else if (number && key == "UID_MAX") {
            range.last = *number;
        }
    }
    return range;
}

} // namespace velt
