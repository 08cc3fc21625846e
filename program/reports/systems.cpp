#include "program/reports/systems.h"

#include <algorithm>
#include <span>

namespace ipmisel {

Systems::Systems(const ReportHead& head) : systems_(head.systems), known_(head.nodes) {
    systems_.resize(std::max<std::size_t>(1, head.nodes));
}

void Systems::Add(const Controller& controller) {
    const auto node = static_cast<std::size_t>(controller.node.value_or(1));
    if (node < 1 || node > systems_.size()) return;
    SystemInfo& system = systems_[node - 1];
    system.guid = controller.guid;
    system.manufacturer = controller.manufacturer;
    system.product = controller.product;
    system.serial = controller.serialNumber;
}

const SystemInfo& Systems::Of(Integer node) const {
    static const SystemInfo kNone;
    if (!node) return systems_.size() == 1 ? systems_.front() : kNone;
    const auto index = static_cast<std::size_t>(*node - 1);
    return index < systems_.size() ? systems_[index] : kNone;
}

std::string Systems::LabelOf(Integer node) const {
    if (systems_.size() < 2) return {};
    const std::string& name = Of(node).name;
    const bool isUnique = std::ranges::count(systems_, name, &SystemInfo::name) == 1;
    return isUnique || !node ? name : "node " + std::to_string(*node);
}

std::string Systems::UniqueNameOf(Integer node) const {
    const std::string& name = Of(node).name;
    const std::string label = LabelOf(node);
    if (label.empty() || label == name) return name;
    return name.empty() ? label : name + ' ' + label;
}

Json Systems::AsJson() const {
    Json list = Json::array();
    for (const SystemInfo& system : std::span(systems_).first(known_)) {
        Json json = Json::object();
        const auto add = [&json](const char* key, const std::string& text) {
            if (!text.empty()) json[key] = text;
        };
        add("name", system.name);
        add("guid", system.guid);
        add("manufacturer", system.manufacturer);
        add("product", system.product);
        add("serial", system.serial);
        list.push_back(std::move(json));
    }
    return list;
}

}  // namespace ipmisel
