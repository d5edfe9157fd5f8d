// What the operations on string lists have in common.
#ifndef VELT_TESTS_SUPPORT_FAKE_PLATFORM_LISTS_H
#define VELT_TESTS_SUPPORT_FAKE_PLATFORM_LISTS_H

#include "platform/core.h"
#include "tests/support/fake_platform/text.h"

#include <string>
#include <vector>

namespace fake {

/// One call of an enumerator: enters `operation` with `shown` as its arguments and puts `texts` into the
/// list in place of what it held. Replaces the list when the test asked for it.
int enumerate(const std::string& operation, const std::string& shown, VLIBCSzList** list,
              const std::vector<std::string>& texts);

/// A list that is an input: its name, flags and texts.
Verbatim listContents(const VLIBCSzList* list);

/// The texts of a list that is an input of `operation`; empty when the list is not live.
std::vector<std::string> textsOf(const VLIBCSzList* list, const std::string& operation);

} // namespace fake

#endif
