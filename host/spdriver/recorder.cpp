#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <span>
#include <string>
#include <utility>

#include "base/hex.h"
#include "host/spdriver/capture.h"
#include "tqr/datetime.h"

namespace tqrhost {
namespace {

std::string FactsLine(const Source& source) {
    nlohmann::ordered_json smbios = nlohmann::ordered_json::array();
    for (const auto& structure : source.facts.smbios) smbios.push_back(ipmisel::HexText(structure));
    const nlohmann::ordered_json line = {
        {"ipmisel_capture", 1},
        {"machine_type", source.facts.machineType},
        {"integrated_bmc", source.facts.integratedBmc},
        {"ipmi_driver", source.facts.ipmiDriver},
        {"ipmi_lan", source.facts.ipmiLan},
        {"local_time", source.facts.localTime.value_or("")},
        {"smbios", smbios},
        {"nodes", source.nodes.size()},
    };
    // The machine's own texts need not be UTF-8.
    return line.dump(-1, ' ', false, nlohmann::ordered_json::error_handler_t::replace) + "\n";
}

/// The capture file. Every line goes out by itself, so that a run that is cut leaves what it read.
class CaptureFile : public CaptureWriter {
public:
    CaptureFile(const std::string& name, const Source& source) {
        // A file that was there before is no one's to remove.
        int file = open(name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
        const bool created = file >= 0;
        if (!created && errno == EEXIST) {
            file = open(name.c_str(), O_WRONLY | O_TRUNC | O_CLOEXEC);
        }
        if (file >= 0) file_.reset(fdopen(file, "w"));
        if (file_) {
            setvbuf(file_.get(), nullptr, _IOLBF, BUFSIZ);
            Write(FactsLine(source));
        }
        if (file_ && !failed_) return;
        const std::string reason = std::strerror(errno);
        if (created) unlink(name.c_str());
        throw SourceError("the capture " + name + " cannot be written: " + reason +
                          "; name another file");
    }
    bool Finish() override {
        if (std::fflush(file_.get()) != 0) failed_ = true;
        return !failed_;
    }
    void Write(const std::string& line) {
        if (std::fputs(line.c_str(), file_.get()) == EOF) failed_ = true;
    }

private:
    struct Close {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };
    std::unique_ptr<std::FILE, Close> file_;
    bool failed_ = false;
};

class RecordingTransport : public Transport {
public:
    RecordingTransport(std::unique_ptr<Transport> transport, std::size_t node,
                       std::shared_ptr<CaptureFile> capture)
        : transport_(std::move(transport)), node_(node), capture_(std::move(capture)) {}
    std::optional<Response> Exchange(const RequestFrame& request) override {
        auto response = transport_->Exchange(request);
        if (response && response->empty()) response.reset();
        capture_->Write("{\"node\": " + std::to_string(node_) + ", \"request\": \"" +
                        ipmisel::HexText(request.bytes()) + "\", \"response\": " +
                        (response ? "\"" + ipmisel::HexText(*response) + "\"" : "null") + "}\n");
        return response;
    }

private:
    std::unique_ptr<Transport> transport_;
    std::size_t node_;
    std::shared_ptr<CaptureFile> capture_;
};

}  // namespace

std::shared_ptr<CaptureWriter> RecordTo(const std::string& file, Source& source) {
    // The time is held still from here on, so that the replay gives the report that is made now.
    if (!source.facts.localTime) {
        source.facts.localTime = NQORTQR20::TOSSpecific::GetLocalTime().ToString();
    }
    auto capture = std::make_shared<CaptureFile>(file, source);
    for (std::size_t node = 0; node < source.nodes.size(); ++node) {
        SourceNode& recorded = source.nodes[node];
        if (recorded.pipeline) {
            recorded.transport = std::make_unique<PipelineTransport>(std::move(recorded.pipeline));
        }
        recorded.transport =
            std::make_unique<RecordingTransport>(std::move(recorded.transport), node, capture);
    }
    return capture;
}

}  // namespace tqrhost
