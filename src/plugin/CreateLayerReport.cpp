#include "plugin/CreateLayerReport.h"

#include "ui/ErrorReport.h"

namespace plugin {

void ReportCreateLayerError(pi::FilterRecord* filterRecord) { ::ReportCreateLayerError(filterRecord); }

}  // namespace plugin
