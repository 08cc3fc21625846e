#include "host/spdriver/completeness.h"

#include <algorithm>

namespace NQORTQR20 {

bool NodeCompleteness::Whole() const {
    const bool faulty = std::any_of(faults.begin(), faults.end(),
                                    [](const ReadFault& fault) { return fault.ofLogOrSensors; });
    return !faulty && log.Missing() == 0 && log.NotExported() == 0 && sensors.Missing() == 0;
}

}  // namespace NQORTQR20
