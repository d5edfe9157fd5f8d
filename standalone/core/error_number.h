// The kinds of errors of this platform.
#ifndef VELT_STANDALONE_CORE_ERROR_NUMBER_H
#define VELT_STANDALONE_CORE_ERROR_NUMBER_H

#include "base/result.h"

namespace velt {

/// Kinds of errors, as VLIBCErrGet reports them.
enum class ErrorNumber : int {
    none = 0,
    invalid = 0x0100,     ///< a value that a daemon or the store would refuse
    notFound = 0x0200,    ///< no such share, user, group, rule or service
    store = 0x0300,       ///< a file of the settings store cannot be read or written
    damaged = 0x0301,     ///< a file of the settings store does not have its form
    daemon = 0x0400,      ///< a daemon does not start, stop or take its configuration
    portTaken = 0x0401,   ///< a port is in use by another program
    certificate = 0x0402, ///< the certificate of FTPS, or its key, cannot be used
    firewall = 0x0500,    ///< the firewall does not take the rules
    log = 0x0600,         ///< the administrator log cannot be written
    event = 0x0700,       ///< a system event cannot be announced
    outOfMemory = 0x0800,
};

} // namespace velt

#endif
