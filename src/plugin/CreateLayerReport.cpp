#include "plugin/CreateLayerReport.h"

#if NOCTIVA_WITH_UI
#include "ui/ErrorReport.h"
#else
#include <iostream>
#endif

namespace plugin {

#if NOCTIVA_WITH_UI
void ReportCreateLayerError(pi::FilterRecord* filterRecord) { ::ReportCreateLayerError(filterRecord); }
#else
// A build without the toolkit has no catalogue either: the English text goes to standard error.
void ReportCreateLayerError(pi::FilterRecord*) {
    std::cerr << "Noctiva: Warning: The layer for the result could not be created.\n"
                 "The filter is applied to the current layer instead.\n"
              << std::flush;
}
#endif

}  // namespace plugin
