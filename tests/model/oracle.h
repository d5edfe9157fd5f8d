// The model of access: what each request must come to.
#ifndef VELT_TESTS_MODEL_ORACLE_H
#define VELT_TESTS_MODEL_ORACLE_H

#include "tests/model/expectation.h"
#include "tests/model/view_path.h"

namespace velt::model {

class Oracle {
public:
    Oracle(const Tree& tree, const Asker& asker, const std::string& data)
        : tree_(tree), account_(asker.account), protocol_(asker.protocol), opened_(asker.opened),
          kept_(asker.view.kept), paths_(tree, asker.view, asker.account), data_(data) {}

    Expectation enter(const std::string& path) const;
    Expectation list(const std::string& path) const;
    Expectation read(const std::string& path) const;
    Expectation write(const std::string& path, bool append) const;
    Expectation cut(const std::string& path) const;
    Expectation make(const std::string& path) const;
    Expectation remove(const std::string& path) const;
    Expectation removeFolder(const std::string& path) const;
    Expectation changeMode(const std::string& path, const std::string& mode) const;
    Expectation changeTimes(const std::string& path) const;

    Expectation rename(const std::string& from, const std::string& to) const;
    Expectation replace(const std::string& from, const std::string& to) const;
    Expectation twin(const std::string& from, const std::string& to) const;
    Expectation linkTo(const std::string& target, const std::string& path) const;

    Expectation open(const std::string& path, bool writing) const;
    Expectation readOpen() const;
    Expectation writeOpen() const;
    Expectation changeModeOfOpen(const std::string& mode) const;

private:
    bool isObeyed(const Spot& spot) const;
    bool keepsName(const Target& target) const;
    bool isKept(const std::string& folder, const std::string& place) const;
    bool mayChange(const Target& target) const {
        return !keepsName(target) && paths_.lets(target.folder, toWrite | toEnter);
    }
    bool mayWrite(const Target& target) const {
        return target.reached == Reached::nothing
                   ? mayChange(target)
                   : paths_.lets(target.spot, toWrite) && !isObeyed(target.spot);
    }
    const Node* fileAt(const Target& target) const;
    Expectation withText(const Target& target, const std::string& text) const;
    Expectation withNew(const Target& target, Kind kind, const std::string& text) const;
    Expectation without(const Target& target) const;
    Expectation withMode(const std::string& place, const std::string& mode) const;
    bool mayOwn(const Target& target) const;

    bool mayGetTwin(const Node& node) const;
    Expectation renameOverFtp(const Target& source, const Target& target) const;
    Expectation renameOverSftp(const Target& source, const Target& target) const;
    Expectation renameWithin(const Target& source, const Target& target) const;
    Expectation copy(const Target& source, const Target& target) const;
    Expectation twinOf(const Target& source, const Target& target) const;

    const Tree& tree_;
    const Account& account_;
    Protocol protocol_;
    const std::optional<OpenFile>& opened_;
    const KeptNames& kept_;
    ViewPaths paths_;
    const std::string& data_;
};

inline const Expectation refused{};
inline const Expectation undecided{Verdict::undecided, {}, {}, {}, {}};

inline Expectation allowed(std::optional<Tree> after = {}) {
    return {Verdict::allowed, {}, {}, std::move(after), {}};
}

/// Where names were followed that others laid, servers differ in what becomes of the last one.
inline bool isUnclear(const Target& target) {
    return target.reached == Reached::unclear || (target.throughLink && target.reached != Reached::node);
}

} // namespace velt::model

#endif
