// Looking into results.
#ifndef VELT_TESTS_SUPPORT_RESULT_H
#define VELT_TESTS_SUPPORT_RESULT_H

#include "base/result.h"

#include <string>

namespace velt::test {

/// Why there is no value; "" when there is one.
template<class Value> std::string messageOf(const Result<Value>& result) {
    return result ? std::string() : result.error().message;
}

} // namespace velt::test

#endif
