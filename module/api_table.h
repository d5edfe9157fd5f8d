// What the module exports: its API table, and the function that hands it out. The framework calls the entry
// function of the row whose API name, version and method match a request.
#ifndef VELT_MODULE_API_TABLE_H
#define VELT_MODULE_API_TABLE_H

#include "platform/webapi.h"

#define VELT_EXPORT __attribute__((visibility("default")))

extern "C" {

/// The 16 rows and the terminating row of zeros.
extern VELT_EXPORT const VELT::APITableRow gTable[17];

/// Returns the first row of gTable. No side effects; may be called from any thread, any number of times.
VELT_EXPORT const VELT::APITableRow* GetAPITable();
}

#endif
