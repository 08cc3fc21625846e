#include "plugins/standard/controller_class.h"

#include <array>
#include <iterator>

#include "plugins/standard/classes.h"
#include "plugins/standard/enterprise_names.h"

namespace standard {
namespace {

using enum NQORTQR20::fdrPropertyType;

constexpr const char* kName = "IPMI_Controller";

constexpr NQORTQR20::fdrPropertyInfo kProperties[] = {
    {"Node", kInteger, "number of the node, from 1"},
    {"GUID", kText, "identity of the system in the text form of RFC 4122"},
    {"GUIDOrder", kText,
     "where SMBIOS has an identity too: in whose order of bytes it was read, \"IPMI\", \"SMBIOS\" "
     "or \"RFC 4122\""},
    {"SystemManufacturer", kText, "by SMBIOS, else by the inventory of device 0"},
    {"SystemProduct", kText, "by SMBIOS, else by the inventory of device 0"},
    {"SystemSerialNumber", kText, "by SMBIOS, else by the inventory of device 0"},
    {"FirmwareVersion", kText, "of the controller, \"major.minor\""},
    {"AuxiliaryRevision", kText, "four bytes whose meaning is the vendor's, hexadecimal"},
    {"IPMIVersion", kText, "of the standard that the controller keeps to"},
    {"DeviceID", kText, "device ID, decimal"},
    {"DeviceRevision", kText, "device revision, decimal"},
    {"ManufacturerID", kInteger, "IANA enterprise number"},
    {"Manufacturer", kText, "its name, where the system has IANA's list"},
    {"ProductID", kInteger, "the manufacturer's number for the product"},
    {"Capabilities", kTextList, "additional device support"},
    {"SelfTest", kText, "result of the controller's test of itself"},
    {"Time", kTime, "the controller's time"},
    {"ClockOffsetSeconds", kReal, "the controller's time less the collector's"},
    {"ClockUncertaintySeconds", kReal, "how far the offset may be wrong"},
    {"UTCOffsetMinutes", kInteger, "by how much the controller's clock is ahead of UTC"},
    {"PowerOn", kBoolean, "whether the system has power"},
    {"LastPowerEvent", kTextList, "why the power last changed"},
    {"PowerFaults", kTextList, "what is wrong with the power"},
    {"ChassisIntrusion", kBoolean, "whether the chassis is open"},
};

std::vector<std::string> Strings(const std::vector<std::string_view>& views) {
    return {views.begin(), views.end()};
}

const char* OrderName(ipmi::GuidOrder order) {
    switch (order) {
        case ipmi::GuidOrder::kIpmi:
            return "IPMI";
        case ipmi::GuidOrder::kSmbios:
            return "SMBIOS";
        case ipmi::GuidOrder::kRfc4122:
            return "RFC 4122";
    }
    return "";
}

void Announce(NodePass& pass) {
    // Not Get SEL Time: what matters of it is when it was answered.
    pass.node().controller().Announce(std::to_array(
        {ipmi::GetSystemGuid(), ipmi::GetFruInventoryAreaInfo(kOwnFruDevice), ipmi::GetDeviceId(),
         ipmi::GetSelfTestResults(), ipmi::GetSelTimeUtcOffset(), ipmi::GetChassisStatus()}));
}

void Write(NodePass& pass, Output& output) {
    Node& node = pass.node();
    if (!output.Begin(kName)) return;
    output.Integer("Node", node.number());
    const auto& system = pass.Smbios().system;
    const GuidReading guid = ReadGuid(node.Guid(), system ? system->uuid : std::nullopt);
    output.Text("GUID", guid.text);
    output.Text("GUIDOrder", guid.order);
    const SystemIdentity identity = pass.Identity();
    output.Text("SystemManufacturer", identity.manufacturer);
    output.Text("SystemProduct", identity.product);
    output.Text("SystemSerialNumber", identity.serialNumber);
    if (const auto& id = node.DeviceId()) {
        output.Text("FirmwareVersion", ipmi::FirmwareVersionText(*id));
        output.Text("AuxiliaryRevision", ipmi::AuxiliaryRevisionText(*id));
        output.Text("IPMIVersion", ipmi::IpmiVersionText(*id));
        if (id->deviceId != ipmi::kUnspecifiedDeviceId) {
            output.Text("DeviceID", std::to_string(id->deviceId));
        }
        output.Text("DeviceRevision", std::to_string(id->deviceRevision));
        if (id->HasManufacturer()) {
            output.Integer("ManufacturerID", id->manufacturerId);
            output.Text("Manufacturer", EnterpriseName(id->manufacturerId));
        }
        if (id->HasProduct()) output.Integer("ProductID", id->productId);
        output.Texts("Capabilities", Strings(ipmi::CapabilityNames(*id)));
    }
    output.Text("SelfTest", node.SelfTest().value_or(""));
    const Clock& clock = node.GetClock();
    output.Time("Time", clock.time);
    output.Real("ClockOffsetSeconds", clock.offsetSeconds);
    output.Real("ClockUncertaintySeconds", clock.uncertaintySeconds);
    output.Integer("UTCOffsetMinutes", clock.utcOffsetMinutes);
    if (const auto& chassis = node.Chassis()) {
        output.Boolean("PowerOn", chassis->powerOn);
        output.Texts("LastPowerEvent", Strings(chassis->lastPowerEvent));
        output.Texts("PowerFaults", Strings(chassis->powerFaults));
        output.Boolean("ChassisIntrusion", chassis->chassisIntrusion);
    }
    output.End();
}

}  // namespace

GuidReading ReadGuid(const std::optional<ipmi::Guid>& guid,
                     const std::optional<ipmi::Guid>& smbiosUuid) {
    if (!guid) return {};
    // Where both differ in every order it is the standard's, as without SMBIOS.
    constexpr ipmi::GuidOrder kStandard = ipmi::GuidOrder::kIpmi;
    if (!smbiosUuid) return {ipmi::GuidText(*guid, kStandard), ""};
    const auto order = ipmi::GuidOrderBySmbios(*guid, *smbiosUuid).value_or(kStandard);
    return {ipmi::GuidText(*guid, order), OrderName(order)};
}

const ClassEntry kControllerClass{
    {kName, "the management controller, its clock, and the power of the chassis",
     NQORTQR20::kByDefault, "Node", nullptr, kProperties, std::size(kProperties)},
    Write,
    Announce};

}  // namespace standard
