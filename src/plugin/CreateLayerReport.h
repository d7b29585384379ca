// Shows the create-layer error report that a caller asks for with 'dRes' 3.
#pragma once

#include "hostapi/HostInterface.h"

namespace plugin {
void ReportCreateLayerError(pi::FilterRecord* filterRecord);
}
