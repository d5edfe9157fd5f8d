// Looking at files as a user would.
#ifndef VELT_STANDALONE_LOGIN_FILE_RIGHTS_H
#define VELT_STANDALONE_LOGIN_FILE_RIGHTS_H

#include "standalone/shares/access.h"

#include <grp.h>
#include <sys/fsuid.h>
#include <unistd.h>

namespace velt {

/// While it lives, files are opened with the user's rights: with the user's number for file access the kernel
/// also drops root's capabilities over files. For processes of one thread; one at a time.
class FileRightsOf {
public:
    explicit FileRightsOf(const Identity& user) : taken_(setgroups(user.gids.size(), user.gids.data()) == 0) {
        setfsgid(user.gids.front());
        setfsuid(user.uid);
        // Neither call reports a failure, but each returns the number before it.
        taken_ = taken_ && static_cast<uid_t>(setfsuid(user.uid)) == user.uid &&
                 static_cast<gid_t>(setfsgid(user.gids.front())) == user.gids.front();
    }
    ~FileRightsOf() {
        setfsuid(geteuid());
        setfsgid(getegid());
        setgroups(0, nullptr);
    }
    FileRightsOf(const FileRightsOf&) = delete;
    FileRightsOf& operator=(const FileRightsOf&) = delete;

    bool taken() const { return taken_; }

private:
    bool taken_;
};

} // namespace velt

#endif
