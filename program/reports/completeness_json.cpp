#include "program/reports/completeness_json.h"

namespace ipmisel {
namespace {

Json AccountJson(const NQORTQR20::SourceAccount& account) {
    Json json = Json::object();
    json["announced"] = account.announced ? Json(*account.announced) : Json(nullptr);
    json["read"] = account.read;
    return json;
}

}  // namespace

Json CompletenessJson(const ReportEnd& end) {
    Json nodes = Json::array();
    for (std::size_t node = 0; node < end.completeness.size(); ++node) {
        const NQORTQR20::NodeCompleteness& account = end.completeness[node];
        Json log = AccountJson(account.log);
        if (node < end.exported.size()) log["exported"] = end.exported[node];
        Json faults = Json::array();
        for (const NQORTQR20::ReadFault& fault : account.faults) {
            Json json = {{"what", fault.what}};
            if (!fault.record.empty()) json["record"] = fault.record;
            json["problem"] = fault.problem;
            faults.push_back(std::move(json));
        }
        Json json = {{"node", node + 1}};
        if (!account.source.empty()) json["source"] = account.source;
        json["log"] = std::move(log);
        json["sensors"] = AccountJson(account.sensors);
        for (const auto& [key, asked] : kAskedAccounts) {
            if ((account.*asked).announced) json[key] = AccountJson(account.*asked);
        }
        json["faults"] = std::move(faults);
        nodes.push_back(std::move(json));
    }
    // What could not be opened is no node.
    for (const NQORTQR20::UnreachableNode& node : end.unreachable) {
        nodes.push_back(
            {{"source", node.name},
             {"faults", Json::array({{{"what", "opening"}, {"problem", node.reason}}})}});
    }
    return nodes;
}

Json StatusJson(NQORTQR20::TTQRStatusCode status) {
    return {{"code", status.code}, {"text", status.TranslateStatusCode()}};
}

Json PluginJson(const NQORTQR20::PluginInfo& plugin) {
    return {
        {"name", plugin.name}, {"version", plugin.version}, {"interface", plugin.interfaceVersion}};
}

}  // namespace ipmisel
