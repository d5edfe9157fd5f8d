#include "host/api/failure_kind.h"

namespace velt::host {

FailureKind kindOf(ErrorNumber error) {
    switch (error) {
    case ErrorNumber::invalid:
    case ErrorNumber::notFound:
        return {422, "The settings cannot be like this"};
    case ErrorNumber::portTaken:
        return {409, "A port is taken"};
    case ErrorNumber::certificate:
        return {409, "The certificate of FTPS cannot be used"};
    default:
        return {500, "The operation failed"};
    }
}

} // namespace velt::host
