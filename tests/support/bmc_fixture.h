#pragma once

#include <gmock/gmock.h>

#include <algorithm>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "base/bytes.h"
#include "host/core/host.h"
#include "host/spdriver/transport.h"
#include "simulator/simulated_bmc.h"
#include "tqr/splibrary.h"

namespace ipmiseltest {

/// Everything that is logged while it lives.
class LogRecorder {
public:
    LogRecorder()
        : identity_(NQORTQR20::AddLogConsumer(
              NQORTQR20::ILogger::kTrace,
              [this](NQORTQR20::ILogger::ETQRLogSeverity severity, std::string_view text) {
                  lines_.emplace_back(severity, text);
              })) {}
    ~LogRecorder() { NQORTQR20::RemoveLogConsumer(identity_); }
    LogRecorder(const LogRecorder&) = delete;
    LogRecorder& operator=(const LogRecorder&) = delete;

    /// The lines of one severity, in order.
    std::vector<std::string> Lines(int severity) const {
        std::vector<std::string> found;
        for (const auto& [lineSeverity, text] : lines_) {
            if (lineSeverity == severity) found.push_back(text);
        }
        return found;
    }
    const std::vector<std::pair<int, std::string>>& All() const { return lines_; }
    void Clear() { lines_.clear(); }

private:
    std::vector<std::pair<int, std::string>> lines_;
    int identity_;
};

/// What the host says of the machine while this lives.
class Machine {
public:
    explicit Machine(std::string type, std::optional<std::string> localTime = {}) {
        NQORTQR20::MachineFacts facts;
        facts.machineType = std::move(type);
        facts.localTime = std::move(localTime);
        NQORTQR20::SetMachineFacts(std::move(facts));
    }
    ~Machine() { NQORTQR20::SetMachineFacts({}); }
    Machine(const Machine&) = delete;
    Machine& operator=(const Machine&) = delete;
};

/// A simulated BMC as the host's transport, which also keeps the request frames.
class SimulatedTransport : public NQORTQR20::Transport {
public:
    SimulatedTransport(ipmisim::BmcDescription description,
                       std::vector<std::vector<std::uint8_t>>* requests)
        : bmc_(std::move(description)), requests_(requests) {}
    std::optional<NQORTQR20::Response> Exchange(const NQORTQR20::RequestFrame& request) override {
        requests_->emplace_back(request.bytes().begin(), request.bytes().end());
        return bmc_.Execute(request.netFn(), request.lun(), request.command(), request.data());
    }

private:
    ipmisim::SimulatedBmc bmc_;
    std::vector<std::vector<std::uint8_t>>* requests_;
};

/// The call-th use (0 for every use) of a command gets no response.
inline ipmisim::Fault NoResponse(ipmi::CommandCode command, unsigned call) {
    ipmisim::Fault fault;
    fault.netFn = command.netFn;
    fault.command = command.number;
    if (call != 0) fault.call = call;
    return fault;
}
/// It answers a completion code.
inline ipmisim::Fault CompletionCode(ipmi::CommandCode command, unsigned call, std::uint8_t code) {
    ipmisim::Fault fault = NoResponse(command, call);
    fault.kind = ipmisim::Fault::Kind::kCompletionCode;
    fault.completionCode = code;
    return fault;
}
/// It answers these data.
inline ipmisim::Fault Answer(ipmi::CommandCode command, unsigned call, ipmisim::Bytes data) {
    ipmisim::Fault fault = NoResponse(command, call);
    fault.kind = ipmisim::Fault::Kind::kData;
    fault.data = std::move(data);
    return fault;
}

/// How often a command is among request frames.
inline long CountOf(ipmi::CommandCode command,
                    const std::vector<std::vector<std::uint8_t>>& requests) {
    using namespace NQORTQR20::frame;
    return std::count_if(requests.begin(), requests.end(), [&](const auto& request) {
        return request[kNetFnAt] == command.netFn && request[kCommandAt] == command.number;
    });
}

/// A case over one simulated BMC: describe it in `bmc`, then take Library().
class BmcTest : public ::testing::Test {
protected:
    ipmisim::BmcDescription bmc;
    LogRecorder log;
    /// Request frames in the order in which they came, at least 15 bytes each.
    std::vector<std::vector<std::uint8_t>> requests;

    NQORTQR20::SPLibrary* Library() {
        if (!library_) {
            library_ = std::make_unique<NQORTQR20::SPLibrary>(
                std::make_unique<SimulatedTransport>(bmc, &requests));
        }
        return library_.get();
    }
    /// A way to the BMC as it is described now.
    NQORTQR20::SPLibrary* FreshLibrary() {
        library_.reset();
        return Library();
    }
    void FailWith(ipmi::CommandCode command, unsigned call, std::uint8_t completionCode) {
        bmc.faults.push_back(CompletionCode(command, call, completionCode));
    }
    void Silence(ipmi::CommandCode command, unsigned call) {
        bmc.faults.push_back(NoResponse(command, call));
    }
    /// The request frames in hexadecimal digits.
    std::vector<std::string> Frames() const {
        std::vector<std::string> frames;
        for (const auto& frame : requests) {
            frames.push_back(ipmisel::DumpBytes(frame, ipmisel::Digits::kUpperHex));
        }
        return frames;
    }

private:
    std::unique_ptr<NQORTQR20::SPLibrary> library_;
};

/// The text of a property; empty optional when the instance has none of that name.
inline std::optional<std::string> TextOf(const NQORTQR20::Instance& instance,
                                         std::string_view name) {
    for (const auto& [propertyName, value] : instance.properties) {
        if (propertyName == name) return std::get<std::string>(value);
    }
    return std::nullopt;
}

/// The instances of a collection, in memory.
class InstanceRecorder : public NQORTQR20::InstanceSink {
public:
    std::vector<NQORTQR20::Instance> instances;
    /// A property that the host refuses the next time that it is written.
    std::string refusedProperty;

    bool AddProperty(std::string_view name, NQORTQR20::PropertyValue value) override {
        if (refusedProperty.empty() || name != refusedProperty) {
            return InstanceSink::AddProperty(name, std::move(value));
        }
        refusedProperty.clear();
        return false;
    }
    /// The texts of one property in all instances.
    std::vector<std::string> Texts(std::string_view property) const {
        std::vector<std::string> texts;
        for (const NQORTQR20::Instance& instance : instances) {
            texts.push_back(TextOf(instance, property).value_or("(none)"));
        }
        return texts;
    }

protected:
    bool Take(const NQORTQR20::Instance& instance) override {
        instances.push_back(instance);
        return true;
    }
};

}  // namespace ipmiseltest
