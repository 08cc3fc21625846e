#include "host/spdriver/reading.h"

#include <algorithm>
#include <memory>
#include <utility>
#include <vector>

#include "host/spdriver/controller_reader.h"
#include "host/spdriver/memory_transport.h"
#include "host/spdriver/serial_pipeline.h"

namespace NQORTQR20 {
namespace {

struct NodeReader {
    std::size_t number;
    SourceNode* node;
    std::shared_ptr<tqrhost::ControllerReader> reader;
};

/// The event logs for as long as one of them is read, then the sensor repositories.
ReadingState StateOf(const std::vector<NodeReader>& live) {
    const bool log = std::any_of(live.begin(), live.end(),
                                 [](const NodeReader& one) { return one.reader->ReadsLog(); });
    ReadingState state = log ? kEventLogReading : kSensorReading;
    state.announced = 0;
    for (const NodeReader& one : live) {
        const tqrhost::ReadCount count = log ? one.reader->LogCount() : one.reader->SensorCount();
        state.read += count.read;
        if (!count.announced) state.announced.reset();
        if (state.announced) *state.announced += *count.announced;
    }
    return state;
}

}  // namespace

std::vector<NodeReading> ReadLiveNodes(Source& source, ReadingNeeds needs,
                                       const ReadingProgress& progress,
                                       std::vector<std::optional<KnownController>> known) {
    std::vector<NodeReader> live;
    std::vector<RequestPipeline*> pipelines;
    std::vector<NodeReading> readings(source.nodes.size());
    known.resize(source.nodes.size());
    for (std::size_t i = 0; i < source.nodes.size(); ++i) {
        SourceNode& node = source.nodes[i];
        if (needs.every && node.transport) {
            node.pipeline = std::make_unique<tqrhost::SerialPipeline>(std::move(node.transport));
        }
        if (!node.pipeline) continue;
        pipelines.push_back(node.pipeline.get());
        live.push_back({i, &node,
                        std::make_shared<tqrhost::ControllerReader>(node.pipeline.get(), needs,
                                                                    std::move(known[i]))});
    }
    for (const NodeReader& one : live) one.reader->Start();
    tqrhost::RunPipelines(pipelines, [&] {
        if (progress && !live.empty()) progress(StateOf(live));
        return std::all_of(live.begin(), live.end(),
                           [](const NodeReader& one) { return one.reader->Done(); });
    });
    for (const NodeReader& one : live) {
        readings[one.number] = one.reader->Result();
        auto transport = std::make_unique<tqrhost::MemoryTransport>(std::move(one.node->pipeline),
                                                                    one.reader->Take());
        one.node->announce = [memory = transport.get()](ipmi::Command command) {
            memory->Announce(std::move(command));
        };
        one.node->endPass = [memory = transport.get()] { return memory->EndPass(); };
        one.node->transport = std::move(transport);
    }
    return readings;
}

}  // namespace NQORTQR20
