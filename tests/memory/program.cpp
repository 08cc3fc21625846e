// The program at a time that is held still; and, compiled so, without what the host remembers:
// nothing is read before the plug-ins' pass, and each of their requests goes to the controller.
// What stands here takes the place of the host's.

#include "host/spdriver/reading.h"
#include "program/run_program.h"
#include "tqr/datetime.h"

namespace NQORTQR20 {

TCIMDateTime TOSSpecific::GetLocalTime() { return TCIMDateTime("20260310093000.000000+000"); }

#ifdef WITHOUT_MEMORY
std::vector<NodeReading> ReadLiveNodes(Source& source, ReadingNeeds, const ReadingProgress&,
                                       std::vector<std::optional<KnownController>>) {
    return std::vector<NodeReading>(source.nodes.size());
}
// Ambiguous, were it another function than the host's.
[[maybe_unused]] constexpr auto kInItsPlace = &ReadLiveNodes;
#endif

}  // namespace NQORTQR20

int main(int argc, char** argv) { return ipmisel::RunProgram(argc, argv); }
