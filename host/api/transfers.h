// /api/transfers: what sessions did.
#ifndef VELT_HOST_API_TRANSFERS_H
#define VELT_HOST_API_TRANSFERS_H

#include "host/api/route.h"

namespace velt::host {

/// GET with the filters of operation_query.h, a page at a time, newest first. The header Link leads to the
/// next page.
Route transferRoute();

} // namespace velt::host

#endif
