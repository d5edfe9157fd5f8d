// Where the library's C++ ends and the contract's C begins.
#ifndef VELT_STANDALONE_CONTRACT_BOUNDARY_H
#define VELT_STANDALONE_CONTRACT_BOUNDARY_H

#include "standalone/contract/last_error.h"

#include <exception>
#include <new>
#include <string>
#include <utility>

namespace velt {

inline int toContract(int result) {
    return result;
}
inline int toContract(const Result<>& result) {
    return result ? 0 : fail(result.error());
}
inline int toContract(const Result<int>& result) {
    return result ? *result : fail(result.error());
}

/// Calls `operation` and returns its int, or that of its Result: 0 or the value, -1 with the last error set.
/// An exception does not leave it: the result is then -1, with the last error set. A contract function
/// that can throw, even by allocating, has its body in here.
template<class Operation> int atBoundary(Operation&& operation) noexcept {
    try {
        return toContract(std::forward<Operation>(operation)());
    } catch (const std::bad_alloc&) {
        // An empty sentence needs no memory.
        return fail(ErrorNumber::outOfMemory, std::string());
    } catch (const std::exception& error) {
        return fail(ErrorNumber::store, std::string("Unexpected failure: ") + error.what() + ".");
    }
}

} // namespace velt

#endif
