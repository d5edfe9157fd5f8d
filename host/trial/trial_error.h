#ifndef VELT_HOST_TRIAL_TRIAL_ERROR_H
#define VELT_HOST_TRIAL_TRIAL_ERROR_H

#include "base/result.h"

#include <stdexcept>
#include <utility>

namespace velt::host {

/// The trial cannot go on; what() says why, and what to do.
class TrialError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
    explicit TrialError(const Error& error) : std::runtime_error(error.message) {}
};

/// The value, when there is one. Throws TrialError.
template<class Value> Value valueOf(Result<Value> result) {
    if (!result) {
        throw TrialError(result.error());
    }
    return std::move(*result);
}

inline void check(const Result<>& result) {
    if (!result) {
        throw TrialError(result.error());
    }
}

} // namespace velt::host

#endif
