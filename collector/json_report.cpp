#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <nlohmann/json.hpp>
#include <stdexcept>
#include <type_traits>

#include "collector/report.h"

namespace ipmisel {
namespace {

using Json = nlohmann::ordered_json;

/// Bytes that are not UTF-8 come out as U+FFFD.
std::string Text(const Json& json) {
    return json.dump(-1, ' ', false, Json::error_handler_t::replace);
}

Json ValueOf(const tqrhost::PropertyValue& value) {
    return std::visit(
        [](const auto& v) -> Json {
            using T = std::decay_t<decltype(v)>;
            if constexpr (std::is_same_v<T, tqrhost::ObjectPath>) {
                Json keys = Json::object();
                for (const auto& [key, text] : v.keys) keys[key] = text;
                return {{"class", v.className}, {"keys", std::move(keys)}};
            } else {
                return v;
            }
        },
        value);
}

std::string InstanceText(const tqrhost::Instance& instance) {
    Json properties = Json::object();
    for (const auto& [name, value] : instance.properties) properties[name] = ValueOf(value);
    return Text({{"class", instance.className}, {"properties", std::move(properties)}});
}

Json AccountOf(const tqrhost::SourceAccount& account) {
    Json json = Json::object();
    json["announced"] = account.announced ? Json(*account.announced) : Json(nullptr);
    json["read"] = account.read;
    return json;
}

Json CompletenessOf(const ReportEnd& end) {
    Json nodes = Json::array();
    for (std::size_t node = 0; node < end.completeness.size(); ++node) {
        const tqrhost::NodeCompleteness& account = end.completeness[node];
        Json log = AccountOf(account.log);
        log["exported"] = node < end.exported.size() ? end.exported[node] : 0;
        Json faults = Json::array();
        for (const tqrhost::ReadFault& fault : account.faults) {
            Json json = {{"what", fault.what}};
            if (!fault.record.empty()) json["record"] = fault.record;
            json["problem"] = fault.problem;
            faults.push_back(std::move(json));
        }
        nodes.push_back({{"node", node},
                         {"log", std::move(log)},
                         {"sensors", AccountOf(account.sensors)},
                         {"faults", std::move(faults)}});
    }
    return nodes;
}

/// The status stands before the instances and is known after them: they wait in a file without a
/// name.
class JsonReport : public ReportWriter {
public:
    JsonReport(std::FILE* out, ReportHead head)
        : out_(out), head_(std::move(head)), spool_(std::tmpfile(), &std::fclose) {
        if (!spool_) {
            throw std::runtime_error(std::string("cannot make a temporary file: ") +
                                     std::strerror(errno));
        }
    }
    void Finish(const ReportEnd& end) override {
        const auto print = [this](const std::string& text) { std::fputs(text.c_str(), out_); };
        print("{\n  \"source\": " + Text(head_.source));
        const Json plugin = {{"name", head_.plugin.name},
                             {"version", head_.plugin.version},
                             {"interface", head_.plugin.interfaceVersion}};
        print(",\n  \"plugin\": " + Text(plugin));
        const Json status = {{"code", end.status.code}, {"text", end.status.TranslateStatusCode()}};
        print(",\n  \"status\": " + Text(status) + ",\n  \"instances\": [");
        CopySpool();
        print(any_ ? "\n  ]" : "]");
        print(",\n  \"notices\": " + Text(end.notices));
        print(",\n  \"completeness\": " + Text(CompletenessOf(end)) + "\n}\n");
    }

protected:
    bool Take(const tqrhost::Instance& instance) override {
        const std::string text = (any_ ? ",\n    " : "\n    ") + InstanceText(instance);
        any_ = true;
        return std::fwrite(text.data(), 1, text.size(), spool_.get()) == text.size();
    }

private:
    void CopySpool() {
        std::rewind(spool_.get());
        std::vector<char> room(1 << 16);
        for (std::size_t n; (n = std::fread(room.data(), 1, room.size(), spool_.get())) > 0;) {
            std::fwrite(room.data(), 1, n, out_);
        }
    }

    std::FILE* out_;
    ReportHead head_;
    std::unique_ptr<std::FILE, int (*)(std::FILE*)> spool_;
    bool any_ = false;
};

class NdjsonReport : public ReportWriter {
public:
    explicit NdjsonReport(std::FILE* out) : out_(out) {}
    void Finish(const ReportEnd&) override {}

protected:
    bool Take(const tqrhost::Instance& instance) override {
        const std::string line = InstanceText(instance) + "\n";
        return std::fwrite(line.data(), 1, line.size(), out_) == line.size();
    }

private:
    std::FILE* out_;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeJsonReport(std::FILE* out, const ReportHead& head) {
    return std::make_unique<JsonReport>(out, head);
}

std::unique_ptr<ReportWriter> MakeNdjsonReport(std::FILE* out, const ReportHead&) {
    return std::make_unique<NdjsonReport>(out);
}

}  // namespace ipmisel
