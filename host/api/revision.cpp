#include "host/api/revision.h"

#include "host/base/random_text.h"

namespace velt::host {

namespace {

constexpr std::size_t runBytes = 8;

} // namespace

Revision::Revision() : run_(randomHexadecimal(runBytes)) {}

std::string Revision::tag() const {
    return "\"" + run_ + "-" + std::to_string(count_.load()) + "\"";
}

bool Revision::allows(const std::string& ifMatch) const {
    return ifMatch.empty() || ifMatch == "*" || ifMatch.find(tag()) != std::string::npos;
}

} // namespace velt::host
