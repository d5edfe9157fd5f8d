// The model of access: where the paths of a view lead.
#ifndef VELT_TESTS_MODEL_VIEW_PATH_H
#define VELT_TESTS_MODEL_VIEW_PATH_H

#include "tests/model/policy.h"

namespace velt::model {

/// A folder or file as seen through a mount of the view.
struct Spot {
    int mount = -1;    ///< -1: the root that shows shares side by side
    std::string place; ///< "" in that root
};

enum class Reached {
    node,    ///< it exists
    nothing, ///< only its folder exists
    barred,  ///< not even that, or not for this account
    unclear, ///< it leads to what no longer has a place
};

struct Target {
    Reached reached = Reached::barred;
    Spot spot;
    Spot folder; ///< in which it is or would be
    std::string name;
    bool isMountPoint = false; ///< or the root of the view
    bool throughLink = false;  ///< the last part is a link that was followed
};

class ViewPaths {
public:
    ViewPaths(const Tree& tree, const View& view, const Account& account)
        : tree_(tree), view_(view), account_(account) {}

    Target find(const std::string& path, bool followLast) const;

    Access accessOf(const Spot& spot) const;
    /// Nothing for the root that shows shares side by side.
    const Node* nodeAt(const Spot& spot) const { return tree_.at(spot.place); }
    /// The place of the outermost folder in which it is shown.
    std::string rootOf(const Spot& spot) const;
    std::set<std::string> namesIn(const Spot& spot) const;
    bool lets(const Spot& spot, unsigned bits) const;

private:
    Spot mountedAt(int mount, const std::string& name, std::uint64_t over) const;
    Target step(const Spot& folder, const std::string& name) const;
    Spot root() const;

    const Tree& tree_;
    const View& view_;
    const Account& account_;
};

} // namespace velt::model

#endif
