#include "plugin/CreateLayerReport.h"

#include <cstdio>

namespace plugin {

// Stand-in until the message dialog exists: the report goes to the log (standard error).
void ReportCreateLayerError(pi::FilterRecord*) {
    std::fputs("Noctiva: the host could not create the layer this filter needs.\n", stderr);
}

}  // namespace plugin
