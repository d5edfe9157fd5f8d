#ifndef VELT_HOST_API_OPENAPI_DOCUMENT_H
#define VELT_HOST_API_OPENAPI_DOCUMENT_H

namespace velt::host {

/// docs/openapi.json as it was when the program was built.
extern const char* const openApiDocument;

} // namespace velt::host

#endif
