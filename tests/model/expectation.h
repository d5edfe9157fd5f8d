// The model of access: what one step of a session must come to.
#ifndef VELT_TESTS_MODEL_EXPECTATION_H
#define VELT_TESTS_MODEL_EXPECTATION_H

#include "tests/model/policy.h"
#include "tests/model/step.h"
#include "tests/system/support/file_client.h"

namespace velt::model {

using test::Protocol;

enum class Verdict {
    allowed,
    refused,
    undecided, ///< protocols and servers differ here; only mayReach binds
};

/// A file that a session has open.
struct OpenFile {
    std::string path;       ///< by which it was opened
    std::string place;      ///< at which it stood then
    std::uint64_t file = 0; ///< 0: it was made
    bool writing = false;
    Access access = Access::none; ///< of the view where it stood
};

/// Who does a step.
struct Asker {
    const Account& account;
    const View& view;
    Protocol protocol;
    const std::optional<OpenFile>& opened;
};

struct Expectation {
    Verdict verdict = Verdict::refused;
    std::string content;            ///< of a file that is read
    std::set<std::string> names;    ///< in a folder that is listed
    std::optional<Tree> after;      ///< nothing: all stays as it is
    std::optional<OpenFile> opened; ///< when it is allowed
};

/// Whether it is a step of a session.
bool isAsked(const Step& step);

/// Whether the step makes a folder or link, or moves or removes something. A session that is older than the
/// last change of the shares or rules may not do that any more.
bool changesNames(const Step& step);

/// Whether the step is about the file that the session has open.
bool isOfOpenFile(const Step& step);

/// Of a step like "read SESSION PATH". `data` is what a file gets that is written. A step about an open file
/// is one of a file that is somewhere.
Expectation expect(const Tree& tree, const Asker& asker, const Step& step, const std::string& data);

} // namespace velt::model

#endif
