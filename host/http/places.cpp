#include "host/http/places.h"

#include <utility>

namespace velt::host {

Places::Place::Place(Places& places, std::string holder) : places_(places), holder_(std::move(holder)) {}

Places::Place::~Place() {
    const std::lock_guard lock(places_.mutex_);
    const auto taken = places_.taken_.find(holder_);
    if (--taken->second == 0) {
        places_.taken_.erase(taken);
    }
}

std::unique_ptr<Places::Place> Places::take(const std::string& holder) {
    const std::lock_guard lock(mutex_);
    std::size_t& taken = taken_[holder];
    if (taken >= limit_ && !holder.empty()) {
        return nullptr;
    }
    ++taken;
    return std::make_unique<Place>(*this, holder);
}

} // namespace velt::host
