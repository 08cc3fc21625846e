#pragma once

#include <string>
#include <utility>

#include "host/core/handle_registry.h"
#include "host/core/sink.h"
#include "tqr/plugin.h"

// What stands behind the handles that a plug-in holds.

namespace NQORTQR20 {

struct TCPluginCallbacks : tqrhost::HandleRegistry<TCPluginCallbacks> {
    explicit TCPluginCallbacks(std::string pathOfPlugin) : path(std::move(pathOfPlugin)) {}
    std::string path;
};

struct fdriIOHandle : tqrhost::HandleRegistry<fdriIOHandle> {
    explicit fdriIOHandle(InstanceSink& instanceSink) : sink(instanceSink) {}
    InstanceSink& sink;
    bool open = false;  ///< an instance is
};

}  // namespace NQORTQR20
