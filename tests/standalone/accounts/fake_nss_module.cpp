// A name service module with three users and one group. Its records are larger than the first buffer that
// callers offer, so that they have to grow it.
#include <grp.h>
#include <nss.h>
#include <pwd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <string>
#include <thread>

#define JOIN_NAMES(source, name) _nss_##source##_##name
#define ENTRY(source, name) JOIN_NAMES(source, name)
#define QUOTE_NAME(source) #source
#define QUOTE(source) QUOTE_NAME(source)

namespace {

struct FakeUser {
    std::string name;
    uid_t uid;
    std::string gecos;
};

bool isDomain() {
    return std::string(QUOTE(FAKE_SOURCE)) == "winbind";
}

FakeUser userAt(std::size_t index) {
    if (isDomain()) {
        return {index == 0   ? "OFFICE\\anna"
                : index == 1 ? "LAB\\anna"
                             : "shared",
                2'000'000U + unsigned(index),
                "Anna of " + std::string(index == 0 ? "the office" : "the lab") + std::string(9000, ',')};
    }
    return {index == 0   ? "berta@example.org"
            : index == 1 ? "shared"
                         : "local1",
            3'000'000U + unsigned(index), "Berta, room 7"};
}

std::size_t position = 0;

nss_status fill(const FakeUser& user, passwd* record, char* buffer, std::size_t size, int* error) {
    const std::size_t needed = user.name.size() + user.gecos.size() + 2;
    if (size < needed) {
        *error = ERANGE;
        return NSS_STATUS_TRYAGAIN;
    }
    std::memcpy(buffer, user.name.c_str(), user.name.size() + 1);
    char* gecos = buffer + user.name.size() + 1;
    std::memcpy(gecos, user.gecos.c_str(), user.gecos.size() + 1);
    *record = {};
    record->pw_name = buffer;
    record->pw_gecos = gecos;
    record->pw_uid = user.uid;
    record->pw_gid = 4'000'000;
    return NSS_STATUS_SUCCESS;
}

nss_status fillGroup(group* record, char* buffer, std::size_t size, int* error) {
    const std::string name = std::string(QUOTE(FAKE_SOURCE)) + "-people";
    if (size <= name.size()) {
        *error = ERANGE;
        return NSS_STATUS_TRYAGAIN;
    }
    std::memcpy(buffer, name.c_str(), name.size() + 1);
    *record = {};
    record->gr_name = buffer;
    record->gr_gid = isDomain() ? 4'000'001 : 4'000'002;
    return NSS_STATUS_SUCCESS;
}

} // namespace

extern "C" {

nss_status ENTRY(FAKE_SOURCE, setpwent)(int);
nss_status ENTRY(FAKE_SOURCE, endpwent)();
nss_status ENTRY(FAKE_SOURCE, getpwent_r)(passwd*, char*, std::size_t, int*);
nss_status ENTRY(FAKE_SOURCE, getpwnam_r)(const char*, passwd*, char*, std::size_t, int*);
nss_status ENTRY(FAKE_SOURCE, getpwuid_r)(uid_t, passwd*, char*, std::size_t, int*);
nss_status ENTRY(FAKE_SOURCE, getgrnam_r)(const char*, group*, char*, std::size_t, int*);
nss_status ENTRY(FAKE_SOURCE, getgrgid_r)(gid_t, group*, char*, std::size_t, int*);
nss_status ENTRY(FAKE_SOURCE, initgroups_dyn)(const char*, gid_t, long*, long*, gid_t**, long, int*);

nss_status ENTRY(FAKE_SOURCE, setpwent)(int) {
    position = 0;
    // A domain that is far away.
    if (const char* delay = std::getenv("FAKE_NSS_DELAY_MS"); delay != nullptr) {
        std::this_thread::sleep_for(std::chrono::milliseconds(std::strtol(delay, nullptr, 10)));
    }
    return NSS_STATUS_SUCCESS;
}

nss_status ENTRY(FAKE_SOURCE, endpwent)() {
    return NSS_STATUS_SUCCESS;
}

nss_status ENTRY(FAKE_SOURCE, getpwent_r)(passwd* record, char* buffer, std::size_t size, int* error) {
    if (position == 3) {
        return NSS_STATUS_NOTFOUND;
    }
    const nss_status status = fill(userAt(position), record, buffer, size, error);
    if (status == NSS_STATUS_SUCCESS) {
        ++position;
    }
    return status;
}

nss_status ENTRY(FAKE_SOURCE, getpwnam_r)(const char* name, passwd* record, char* buffer, std::size_t size,
                                          int* error) {
    for (std::size_t i = 0; i < 3; ++i) {
        if (userAt(i).name == name) {
            return fill(userAt(i), record, buffer, size, error);
        }
    }
    // Known to a look-up only, as with a source that does not enumerate.
    if (name == std::string("quiet") && isDomain()) {
        return fill({"quiet", 2'000'009, "Quiet One"}, record, buffer, size, error);
    }
    return NSS_STATUS_NOTFOUND;
}

nss_status ENTRY(FAKE_SOURCE, getpwuid_r)(uid_t uid, passwd* record, char* buffer, std::size_t size,
                                          int* error) {
    if (uid == 2'000'009 && isDomain()) {
        return fill({"quiet", uid, "Quiet One"}, record, buffer, size, error);
    }
    return NSS_STATUS_NOTFOUND;
}

nss_status ENTRY(FAKE_SOURCE, getgrnam_r)(const char* name, group* record, char* buffer, std::size_t size,
                                          int* error) {
    return name == std::string(QUOTE(FAKE_SOURCE)) + "-people" ? fillGroup(record, buffer, size, error)
                                                               : NSS_STATUS_NOTFOUND;
}

nss_status ENTRY(FAKE_SOURCE, getgrgid_r)(gid_t gid, group* record, char* buffer, std::size_t size,
                                          int* error) {
    return gid == (isDomain() ? 4'000'001U : 4'000'002U) ? fillGroup(record, buffer, size, error)
                                                         : NSS_STATUS_NOTFOUND;
}

nss_status ENTRY(FAKE_SOURCE, initgroups_dyn)(const char*, gid_t, long* start, long* size, gid_t** groups,
                                              long, int*) {
    if (*start == *size) {
        *size += 1;
        *groups = static_cast<gid_t*>(std::realloc(*groups, static_cast<std::size_t>(*size) * sizeof(gid_t)));
    }
    (*groups)[(*start)++] = isDomain() ? 4'000'001 : 4'000'002;
    return NSS_STATUS_SUCCESS;
}

} // extern "C"
