// A module that cannot be loaded; WRONG says why.

#include "platform/webapi.h"

#define NO_TABLE 1
#define NULL_TABLE 2
#define DUPLICATE_ROW 3
#define INCOMPLETE_ROW 4
#define UNDEFINED_SYMBOL 5

#if WRONG == UNDEFINED_SYMBOL
extern "C" void VELTNobodyDefinesThis();
#endif

namespace {

void serve(VELT::APIRequest*, VELT::APIResponse*) {
#if WRONG == UNDEFINED_SYMBOL
    VELTNobodyDefinesThis();
#endif
}

[[maybe_unused]] const VELT::APITableRow table[] = {
    {"VELT.Test.Wrong", 1, "get", serve},
#if WRONG == DUPLICATE_ROW
    {"VELT.Test.Wrong", 1, "get", serve},
#elif WRONG == INCOMPLETE_ROW
    {"VELT.Test.Wrong", 2, "get", nullptr},
#endif
    {nullptr, 0, nullptr, nullptr},
};

} // namespace

#if WRONG != NO_TABLE
extern "C" __attribute__((visibility("default"))) const VELT::APITableRow* GetAPITable() {
#if WRONG == NULL_TABLE
    return nullptr;
#else
    return &table[0];
#endif
}
#endif
