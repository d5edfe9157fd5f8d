// The model of access: files that stay open.
#include "tests/model/oracle.h"

#include <algorithm>

namespace velt::model {

Expectation Oracle::open(const std::string& path, bool writing) const {
    const Target target = paths_.find(path, true);
    if (isUnclear(target)) {
        return undecided;
    }
    const Node* node = target.reached == Reached::node ? paths_.nodeAt(target.spot) : nullptr;
    if (target.reached == Reached::node && (node == nullptr || node->kind == Kind::folder)) {
        return writing ? refused : undecided; // it may be opened, and not be read
    }
    const OpenFile opened{path, join(target.folder.place, target.name), node != nullptr ? node->id : 0,
                          writing, paths_.accessOf(target.folder)};
    if (target.reached == Reached::nothing) {
        Expectation made = writing && mayWrite(target) ? withNew(target, Kind::file, "") : refused;
        made.opened = opened;
        return made;
    }
    if (node == nullptr || !(writing ? mayWrite(target) : paths_.lets(target.spot, toRead))) {
        return refused;
    }
    Expectation found = allowed();
    found.opened = opened;
    return found;
}

// What is open stays open, whatever becomes of its name.
Expectation Oracle::readOpen() const {
    const std::string& text = tree_.at(tree_.placeOf(opened_->file))->text;
    return opened_->writing ? refused : Expectation{Verdict::allowed, text, {}, {}, {}};
}

Expectation Oracle::writeOpen() const {
    if (!opened_->writing) {
        return refused;
    }
    const std::string place = tree_.placeOf(opened_->file);
    const std::string& text = tree_.at(place)->text;
    Tree after = tree_;
    after.setText(place, data_ + text.substr(std::min(data_.size(), text.size())));
    return allowed(std::move(after));
}

// Where it was opened for reading, its path has to lead to it still, to where it may be changed.
Expectation Oracle::changeModeOfOpen(const std::string& mode) const {
    const std::string place = tree_.placeOf(opened_->file);
    const bool owns = tree_.at(place)->owner == account_.uid && opened_->access == Access::write;
    if (owns && opened_->writing) {
        return withMode(place, mode);
    }
    const Target target = paths_.find(opened_->path, true);
    if (isUnclear(target) || target.throughLink) {
        return undecided;
    }
    const Node* node = fileAt(target);
    return owns && node != nullptr && node->id == opened_->file && !isObeyed(target.spot)
               ? withMode(place, mode)
               : refused;
}

} // namespace velt::model
