// What the session is told of its view, so that it can say which file of the server it means.
#ifndef VELT_STANDALONE_LOGIN_SHOWN_FACTS_H
#define VELT_STANDALONE_LOGIN_SHOWN_FACTS_H

#include "base/result.h"
#include "base/unique_fd.h"
#include "standalone/login/grants.h"
#include "standalone/rules/chroot_rule.h"

#include <sys/stat.h>

#include <filesystem>
#include <set>
#include <string>
#include <vector>

namespace velt {

/// Collects texts as velt_note_shown_places takes them (standalone/activity/shown_places.h).
class ShownFacts {
public:
    /// The grants outlive this.
    explicit ShownFacts(const Grants& grants) : grants_(grants) {}

    /// The view shows this folder at `path`. What cannot be told is left out.
    void add(const std::string& path, const UniqueFd& folder);

    /// The session may write to this folder, in or through which these rules of others may lead to folders:
    /// whoever moved one of these, or one on the way to it, could put another in its place. Tells all of the
    /// way, also what lies beside the folder. See told_places.h.
    Result<> addRuleFolders(const std::vector<ChrootRule>& rules, const UniqueFd& folder);

    /// Whether the session must know of the text.
    bool isNeeded() const { return !told_.empty(); }

    const std::string& text() const { return text_; }

private:
    void addFact(const std::string& kind, const std::string& name, const std::filesystem::path& place);

    /// The way of this rule within the share, which lies in `folder` at `place` or around it.
    Result<> addWayInShare(const UniqueFd& folder, const std::filesystem::path& place,
                           const std::filesystem::path& share, const std::filesystem::path& below);
    Result<> addWay(const UniqueFd& folder, const std::filesystem::path& below);
    /// One step of a way, and whether that is all of it.
    Result<bool> addStep(const UniqueFd& folder, const std::string& name, mode_t& type);
    void tell(const std::string& kind, const std::string& name, const std::string& place);

    const Grants& grants_;
    std::string text_;
    std::set<std::string> told_; ///< what was told for rules
};

} // namespace velt

#endif
