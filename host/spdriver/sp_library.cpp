#include "tqr/splibrary.h"

#include <algorithm>
#include <cstddef>
#include <exception>
#include <memory>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "host/core/host.h"
#include "host/spdriver/completeness.h"
#include "host/spdriver/loop_guard.h"
#include "host/spdriver/transport.h"

namespace NQORTQR20 {

struct SPLibrary::Impl {
    std::unique_ptr<tqrhost::ReadingWatch> transport;  ///< null when there is no way to the BMC
    bool integratedBmc;
};

}  // namespace NQORTQR20

namespace tqrhost {
namespace {

// The request frame: 0x01, responder address, NetFn, LUN, command, count of data bytes in four
// bytes, data. The reply frame: completion code in byte 4, response from byte 8.
constexpr std::size_t kCountAt = 5;
constexpr std::size_t kDataAt = 9;
constexpr std::size_t kPaddedFrame = 15;
constexpr std::size_t kCompletionCodeAt = 4;
constexpr std::size_t kResponseAt = 8;

/// The nodes of the machine that is collected from.
std::vector<std::unique_ptr<NQORTQR20::SPLibrary>>& Nodes() {
    static std::vector<std::unique_ptr<NQORTQR20::SPLibrary>> nodes;
    return nodes;
}

}  // namespace

std::optional<RequestFrame> RequestFrame::FromBuffer(std::span<const std::uint8_t> buffer) {
    if (buffer.size() < kDataAt) return std::nullopt;
    std::size_t count = 0;
    for (std::size_t i = kDataAt - 1; i >= kCountAt; --i) count = count << 8 | buffer[i];
    if (count > buffer.size() - kDataAt) return std::nullopt;
    RequestFrame frame;
    frame.dataLength_ = count;
    const auto bytes =
        buffer.first(std::max(kDataAt + count, std::min(kPaddedFrame, buffer.size())));
    frame.bytes_.assign(bytes.begin(), bytes.end());
    return frame;
}

void OpenMachine(Source source) {
    CloseMachine();
    SetMachineFacts(std::move(source.facts));
    for (auto& transport : source.nodes) {
        Nodes().push_back(std::make_unique<NQORTQR20::SPLibrary>(std::move(transport),
                                                                 GetMachineFacts().integratedBmc));
    }
}

NodeCompleteness CompletenessOf(const NQORTQR20::SPLibrary& library) {
    const auto& watch = library.impl_->transport;
    return watch ? watch->Account() : NodeCompleteness();
}

std::vector<NodeCompleteness> GetCompleteness() {
    std::vector<NodeCompleteness> accounts;
    for (const auto& node : Nodes()) accounts.push_back(CompletenessOf(*node));
    return accounts;
}

void CloseMachine() {
    Nodes().clear();
    SetMachineFacts({});
}

}  // namespace tqrhost

namespace NQORTQR20 {

SPLibrary::SPLibrary(std::unique_ptr<tqrhost::Transport> transport, bool integratedBmc)
    : impl_(std::make_unique<Impl>()) {
    if (transport) {
        impl_->transport = std::make_unique<tqrhost::ReadingWatch>(
            std::make_unique<tqrhost::LoopGuard>(std::move(transport)));
    }
    impl_->integratedBmc = integratedBmc;
}

SPLibrary::~SPLibrary() = default;

int SPLibrary::GetNumberBMCNode() { return static_cast<int>(tqrhost::Nodes().size()); }

SPLibrary* SPLibrary::GetSplibraryInstance(int node) {
    const auto& nodes = tqrhost::Nodes();
    return node >= 0 && node < GetNumberBMCNode() ? nodes[static_cast<std::size_t>(node)].get()
                                                  : nullptr;
}

bool SPLibrary::IsIPMIDriversPresent() { return tqrhost::GetMachineFacts().ipmiDriver; }

bool SPLibrary::IsiBMCMachine() const { return impl_->integratedBmc; }

bool SPLibrary::sendIPMICommand(unsigned char* buffer, int* length, int bufferSize, bool) {
    if (buffer == nullptr || length == nullptr || bufferSize <= 0) return false;
    if (!impl_->transport) return false;
    const std::span<unsigned char> frame(buffer, static_cast<std::size_t>(bufferSize));
    const auto request = tqrhost::RequestFrame::FromBuffer(frame);
    if (!request) return false;
    std::optional<tqrhost::Response> response;
    try {
        response = impl_->transport->Exchange(*request);
    } catch (const std::exception& error) {  // callers know no exceptions
        const std::string line = std::string("The way to the BMC failed: ") + error.what();
        fdrWriteLog(ILogger::kError, line.c_str());
        return false;
    }
    if (!response || response->empty()) return false;
    std::fill(frame.begin(), frame.end(), static_cast<unsigned char>(0));
    const auto fits = std::min(response->size(), frame.size() - tqrhost::kResponseAt);
    frame[tqrhost::kCompletionCodeAt] = response->front();
    std::copy_n(response->begin(), fits, frame.begin() + tqrhost::kResponseAt);
    *length = static_cast<int>(fits) - 1;
    return true;
}

}  // namespace NQORTQR20
