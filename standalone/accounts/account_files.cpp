#include "standalone/accounts/account_files.h"

#include <algorithm>
#include <array>
#include <charconv>

namespace velt {

namespace {

/// Cuts the text before the first `separator` off `rest`, which becomes what follows it.
std::string_view cut(std::string_view& rest, char separator) {
    const std::size_t end = rest.find(separator);
    const std::string_view head = rest.substr(0, end);
    rest = end == std::string_view::npos ? std::string_view{} : rest.substr(end + 1);
    return head;
}

std::string_view trimmed(std::string_view text) {
    constexpr std::string_view blanks = " \t\r";
    const std::size_t first = text.find_first_not_of(blanks);
    if (first == std::string_view::npos) {
        return {};
    }
    return text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

template<typename Number> bool parseNumber(std::string_view text, Number& number) {
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc{} && end == text.data() + text.size();
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
        uid_t uid = 0;
        gid_t gid = 0;
        if (!parseNumber(fields[2], uid) || !parseNumber(fields[3], gid)) {
            continue;
        }
        users.push_back({std::string(fields[0]), uid, gid, std::string(fields[5]), descriptionOf(fields[4]),
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
        gid_t gid = 0;
        if (!parseNumber(fields[2], gid)) {
            continue;
        }
        LocalGroup group{{std::string(fields[0]), gid, sourceLocal}, {}};
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
        uid_t number = 0;
        if (!parseNumber(trimmed(line.substr(end)), number)) {
            continue;
        }
        if (key == "UID_MIN") {
            range.first = number;
        } else if (key == "UID_MAX") {
            range.last = number;
        }
    }
    return range;
}

} // namespace velt
