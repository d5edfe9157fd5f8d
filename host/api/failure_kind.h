// What a failure of the platform is in terms of HTTP.
#ifndef VELT_HOST_API_FAILURE_KIND_H
#define VELT_HOST_API_FAILURE_KIND_H

#include "standalone/standalone.h"

namespace velt::host {

struct FailureKind {
    int status;        ///< 4xx for what the caller can mend, by another request or by hand
    const char* title; ///< of the problem; static
};

FailureKind kindOf(ErrorNumber error);

} // namespace velt::host

#endif
