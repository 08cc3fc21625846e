#include "tqr/splibrary.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <exception>
#include <memory>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "host/core/host.h"
#include "host/spdriver/completeness_tracker.h"
#include "host/spdriver/loop_guard.h"
#include "host/spdriver/reading.h"
#include "host/spdriver/record_trimmer.h"
#include "host/spdriver/source.h"
#include "ipmi/command.h"

namespace NQORTQR20 {

struct SPLibrary::Impl {
    std::unique_ptr<tqrhost::CompletenessTracker>
        transport;                                ///< null when there is no way to the BMC
    std::function<void(ipmi::Command)> announce;  ///< null where it makes no difference
    bool integratedBmc;
};

struct HostAccess {
    static void SetAnnounce(SPLibrary& library, std::function<void(ipmi::Command)> announce) {
        library.impl_->announce = std::move(announce);
    }
    static tqrhost::CompletenessTracker* TrackerOf(const SPLibrary& library) {
        return library.impl_->transport.get();
    }
};

namespace {

/// The nodes of the machine that is collected from.
struct OpenNode {
    std::string source;
    std::unique_ptr<SPLibrary> library;
    std::function<std::vector<ipmi::Command>()> endPass;
    std::function<std::vector<ReadFault>()> missing;
};

std::vector<OpenNode>& Nodes() {
    static std::vector<OpenNode> nodes;
    return nodes;
}

std::vector<UnreachableNode>& Unreachable() {
    static std::vector<UnreachableNode> unreachable;
    return unreachable;
}

ReadingProgress& Observer() {
    static ReadingProgress observer;
    return observer;
}

unsigned gCommands = 0;
unsigned gRefusedCommand = 0;  ///< see RefusedOptionalCommand

/// Commands that a BMC may lack without being at fault: the auxiliary log, and what vendors define.
bool IsOptional(const RequestFrame& request) {
    return request.code() == ipmi::kGetAuxiliaryLogStatus ||
           request.netFn() >= ipmi::kFirstOemNetFn;
}

/// Empty when nothing came, for whatever reason: callers know no exceptions.
std::optional<Response> Exchange(tqrhost::CompletenessTracker* transport,
                                 const RequestFrame& request) {
    if (transport == nullptr) return std::nullopt;
    try {
        auto response = transport->Exchange(request);
        if (const auto& observer = Observer()) {
            if (const auto state = transport->StateAfter(request)) observer(*state);
        }
        return response;
    } catch (const std::exception& error) {
        const std::string line = std::string("The way to the BMC failed: ") + error.what();
        fdrWriteLog(ILogger::kError, line.c_str());
        return std::nullopt;
    }
}

}  // namespace

void OpenMachine(Source source) {
    CloseMachine();
    SetMachineFacts(std::move(source.facts));
    Unreachable() = std::move(source.unreachable);
    for (SourceNode& node : source.nodes) {
        auto library =
            std::make_unique<SPLibrary>(std::move(node.transport), GetMachineFacts().integratedBmc);
        HostAccess::SetAnnounce(*library, std::move(node.announce));
        Nodes().push_back({std::move(node.name), std::move(library), std::move(node.endPass),
                           std::move(node.missing)});
    }
}

void EndPass() {
    for (const OpenNode& node : Nodes()) {
        if (!node.endPass) continue;
        for (const ipmi::Command& command : node.endPass()) {
            Exchange(HostAccess::TrackerOf(*node.library), RequestFrame(command));
        }
    }
}

void ObserveReading(ReadingProgress progress) { Observer() = std::move(progress); }

unsigned RefusedOptionalCommand() { return gRefusedCommand; }

NodeCompleteness CompletenessOf(const SPLibrary& library) {
    tqrhost::CompletenessTracker* const tracker = HostAccess::TrackerOf(library);
    return tracker ? tracker->Completeness() : NodeCompleteness();
}

std::vector<NodeCompleteness> GetCompleteness() {
    std::vector<NodeCompleteness> accounts;
    for (const OpenNode& node : Nodes()) {
        accounts.push_back(CompletenessOf(*node.library));
        accounts.back().source = node.source;
        if (!node.missing) continue;
        auto& faults = accounts.back().faults;
        for (ReadFault& fault : node.missing()) faults.push_back(std::move(fault));
    }
    return accounts;
}

const std::vector<UnreachableNode>& GetUnreachable() { return Unreachable(); }

void CloseMachine() {
    Nodes().clear();
    Unreachable().clear();
    SetMachineFacts({});
}

SPLibrary::SPLibrary(std::unique_ptr<Transport> transport, bool integratedBmc)
    : impl_(std::make_unique<Impl>()) {
    if (transport) {
        impl_->transport =
            std::make_unique<tqrhost::CompletenessTracker>(std::make_unique<tqrhost::LoopGuard>(
                std::make_unique<tqrhost::RecordTrimmer>(std::move(transport))));
    }
    impl_->integratedBmc = integratedBmc;
}

SPLibrary::~SPLibrary() = default;

int SPLibrary::GetNumberBMCNode() { return static_cast<int>(Nodes().size()); }

SPLibrary* SPLibrary::GetSplibraryInstance(int node) {
    const auto& nodes = Nodes();
    return node >= 0 && node < GetNumberBMCNode()
               ? nodes[static_cast<std::size_t>(node)].library.get()
               : nullptr;
}

bool SPLibrary::IsIPMIDriversPresent() { return GetMachineFacts().ipmiDriver; }

bool SPLibrary::IsiBMCMachine() const { return impl_->integratedBmc; }

bool SPLibrary::sendIPMICommand(unsigned char* buffer, int* length, int bufferSize, bool) {
    if (buffer == nullptr || length == nullptr || bufferSize <= 0) return false;
    if (!impl_->transport) return false;
    const std::span<unsigned char> bytes(buffer, static_cast<std::size_t>(bufferSize));
    const auto request = RequestFrame::FromBuffer(bytes);
    if (!request) return false;
    const std::optional<Response> response = Exchange(impl_->transport.get(), *request);
    ++gCommands;
    const bool refused = response && !response->empty() &&
                         response->front() == ipmi::kInvalidCommand && IsOptional(*request);
    gRefusedCommand = refused ? gCommands : 0;
    if (!response || response->empty()) return false;
    std::fill(bytes.begin(), bytes.end(), static_cast<unsigned char>(0));
    const auto fits = std::min(response->size(), bytes.size() - frame::kResponseAt);
    bytes[frame::kCompletionCodeAt] = response->front();
    std::copy_n(response->begin(), fits, bytes.begin() + frame::kResponseAt);
    *length = static_cast<int>(fits) - 1;
    return true;
}

void SPLibrary::announceIPMICommand(const unsigned char* buffer, int bufferSize) {
    if (buffer == nullptr || bufferSize <= 0 || !impl_->announce) return;
    try {
        const auto request =
            RequestFrame::FromBuffer({buffer, static_cast<std::size_t>(bufferSize)});
        if (request) impl_->announce(request->ToCommand());
    } catch (const std::exception&) {
        // Callers know no exceptions; it is asked when it is wanted.
    }
}

}  // namespace NQORTQR20
