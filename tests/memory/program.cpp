// The program at a time that is held still; and, compiled so, without what the host remembers:
// nothing is read before the plug-ins' pass, and each of their requests goes to the controller.
// What stands here takes the place of the host's.

#include "host/spdriver/pipeline.h"
#include "host/spdriver/reading.h"
#include "program/run_program.h"
#include "tqr/datetime.h"

namespace NQORTQR20 {

TCIMDateTime TOSSpecific::GetLocalTime() { return TCIMDateTime("20260310093000.000000+000"); }

#ifdef WITHOUT_MEMORY
namespace {
/// One request at a time, none ahead.
class PlainTransport : public Transport {
public:
    explicit PlainTransport(std::unique_ptr<RequestPipeline> pipeline)
        : pipeline_(std::move(pipeline)) {}
    std::optional<Response> Exchange(const RequestFrame& request) override {
        return tqrhost::ExchangeOver(*pipeline_, request.ToCommand());
    }

private:
    std::unique_ptr<RequestPipeline> pipeline_;
};
}  // namespace

std::vector<NodeReading> ReadLiveNodes(Source& source, ReadingNeeds, const ReadingProgress&,
                                       std::vector<std::optional<KnownController>>) {
    for (SourceNode& node : source.nodes) {
        if (node.pipeline)
            node.transport = std::make_unique<PlainTransport>(std::move(node.pipeline));
    }
    return std::vector<NodeReading>(source.nodes.size());
}
// Ambiguous, were it another function than the host's.
[[maybe_unused]] constexpr auto kInItsPlace = &ReadLiveNodes;
#endif

}  // namespace NQORTQR20

int main(int argc, char** argv) { return ipmisel::RunProgram(argc, argv); }
