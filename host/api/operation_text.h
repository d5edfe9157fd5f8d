// What sessions did, in the forms in which it is told.
#ifndef VELT_HOST_API_OPERATION_TEXT_H
#define VELT_HOST_API_OPERATION_TEXT_H

#include "standalone/standalone.h"

#include <json/value.h>

#include <string>
#include <vector>

namespace velt::host {

/// What a kind of operation does not have, and what is not known, is left out.
Json::Value toObject(const OperationRecord& record);

/// An object on each line.
std::string toJsonLines(const std::vector<OperationRecord>& records);

/// RFC 4180, with a line of titles. It is for people and their spreadsheets: what those would take for a
/// formula has a ' before it, and a control character is written as \xNN.
std::string toCsv(const std::vector<OperationRecord>& records);

} // namespace velt::host

#endif
