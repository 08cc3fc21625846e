#include "program/reports/class_schema.h"

#include <nlohmann/json.hpp>

namespace ipmisel {
namespace {

using Json = nlohmann::ordered_json;
using NQORTQR20::fdrPropertyType;

Json TypeSchema(fdrPropertyType type) {
    switch (type) {
        case fdrPropertyType::kText:
            return {{"type", "string"}};
        case fdrPropertyType::kInteger:
            return {{"type", "integer"}};
        case fdrPropertyType::kReal:
            return {{"type", "number"}};
        case fdrPropertyType::kBoolean:
            return {{"type", "boolean"}};
        case fdrPropertyType::kTime:
            return {{"type", "string"}, {"format", "date-time"}};
        case fdrPropertyType::kTextList:
            return {{"type", "array"}, {"items", {{"type", "string"}}}};
        case fdrPropertyType::kByteList:
            return {{"type", "array"},
                    {"items", {{"type", "integer"}, {"minimum", 0}, {"maximum", 255}}}};
        case fdrPropertyType::kReference:
            return {
                {"type", "object"},
                {"properties",
                 {{"class", {{"type", "string"}}},
                  {"keys", {{"type", "object"}, {"additionalProperties", {{"type", "string"}}}}}}},
                {"required", {"class", "keys"}}};
    }
    return Json::object();
}

Json InstanceSchema(const NQORTQR20::ClassInfo& info) {
    Json properties = Json::object();
    for (const NQORTQR20::PropertyInfo& property : info.properties) {
        Json schema = TypeSchema(property.type);
        schema["description"] = property.description;
        properties[property.name] = std::move(schema);
    }
    return {{"description", info.description},
            {"type", "object"},
            {"properties",
             {{"class", {{"const", info.name}}},
              {"properties", {{"type", "object"}, {"properties", std::move(properties)}}}}},
            {"required", {"class", "properties"}}};
}

}  // namespace

std::string ClassSchema(const std::vector<NQORTQR20::ClassInfo>& classes) {
    Json any = Json::array();
    Json definitions = Json::object();
    for (const NQORTQR20::ClassInfo& info : classes) {
        any.push_back({{"$ref", "#/$defs/" + info.name}});
        definitions[info.name] = InstanceSchema(info);
    }
    const Json schema = {{"$schema", "https://json-schema.org/draft/2020-12/schema"},
                         {"title", "Instances of ipmisel's classes, format ipmisel/1"},
                         {"anyOf", std::move(any)},
                         {"$defs", std::move(definitions)}};
    return schema.dump(2) + "\n";
}

}  // namespace ipmisel
