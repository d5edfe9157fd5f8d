// One thing that somebody does, as a line of words.
#ifndef VELT_TESTS_MODEL_STEP_H
#define VELT_TESTS_MODEL_STEP_H

#include <string>
#include <vector>

namespace velt::model {

/// The words of a step; none holds a blank.
///
/// The administrator:
///     folder PATH OWNER MODE      file PATH OWNER MODE       link PATH TARGET
///     share NAME PATH [hidden] [USER=none|read|write]... [@GROUP=...]...
///     unshare NAME                rules [USER=PATH]... [@GROUP=PATH]...
///     switches home|shares nobody|guests|guests=SHARE
/// A user with a shell:
///     shell USER mkdir PATH | ln TARGET PATH | twin FROM TO | mv FROM TO | rm PATH | rmdir PATH |
///     chmod MODE PATH | write PATH
/// A user of the service; SESSION is a name, and paths are those of the session's view:
///     login SESSION USER [sftp]   logout SESSION             enter SESSION PATH
///     list SESSION PATH           names SESSION PATH         facts SESSION PATH
///     read SESSION PATH           write SESSION PATH         append SESSION PATH
///     make SESSION PATH           remove SESSION PATH        remove-folder SESSION PATH
///     rename SESSION FROM TO      chmod SESSION PATH MODE
/// One over SFTP, also:
///     replace SESSION FROM TO     twin SESSION FROM TO       symlink SESSION PATH TARGET
///     cut SESSION PATH            times SESSION PATH
///     open-to-read SESSION PATH   open-to-write SESSION PATH
///     read-open SESSION           write-open SESSION         chmod-open SESSION MODE
using Step = std::vector<std::string>;
using Steps = std::vector<Step>;

std::string formatStep(const Step& step);
Step parseStep(const std::string& line);

/// "alice=write" as {"alice", "write"}; the second is "" without "=".
std::pair<std::string, std::string> splitPair(const std::string& word);

} // namespace velt::model

#endif
