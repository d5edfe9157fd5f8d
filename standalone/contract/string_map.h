// What is behind the contract's map of texts.
#ifndef VELT_STANDALONE_CONTRACT_STRING_MAP_H
#define VELT_STANDALONE_CONTRACT_STRING_MAP_H

#include "platform/core.h"

#include <map>
#include <string>

struct VLIBCSzHash {
    std::map<std::string, std::string> entries;
};

#endif
