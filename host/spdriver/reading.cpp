#include "host/spdriver/reading.h"

#include <algorithm>
#include <memory>
#include <utility>
#include <vector>

#include "host/spdriver/memory_transport.h"

namespace tqrhost {

void ReadLiveNodes(Source& source, ReadingNeeds needs, const ReadingProgress& progress) {
    struct Live {
        SourceNode* node;
        std::shared_ptr<ControllerReader> reader;
    };
    std::vector<Live> live;
    std::vector<RequestPipeline*> pipelines;
    for (SourceNode& node : source.nodes) {
        if (!node.pipeline) continue;
        pipelines.push_back(node.pipeline.get());
        live.push_back({&node, std::make_shared<ControllerReader>(node.pipeline.get(), needs)});
    }
    for (const Live& one : live) one.reader->Start();
    std::size_t told = 0;
    RunPipelines(pipelines, [&] {
        std::size_t records = 0;
        for (const Live& one : live) records += one.reader->RecordsRead();
        if (progress && std::exchange(told, records) != records) progress(records);
        return std::all_of(live.begin(), live.end(),
                           [](const Live& one) { return one.reader->Done(); });
    });
    for (const Live& one : live) {
        auto transport =
            std::make_unique<MemoryTransport>(std::move(one.node->pipeline), one.reader->Take());
        one.node->endPass = [memory = transport.get()] { return memory->EndPass(); };
        one.node->transport = std::move(transport);
    }
}

}  // namespace tqrhost
