#include <iterator>
#include <string>
#include <vector>

#include "ipmi/entities.h"
#include "plugins/standard/classes.h"

namespace standard {

namespace {

using enum NQORTQR20::fdrPropertyType;
using NQORTQR20::fdrPropertyInfo;

constexpr fdrPropertyInfo kProperties[] = {
    {"Node", kInteger, "node, from 1"},
    {"DeviceID", kInteger, "FRU device ID at its controller"},
    {"ControllerAddress", kInteger,
     "slave address of another controller that the device is behind"},
    {"Name", kText, "name of the device by its locator"},
    {"Entity", kText, "entity that it is the inventory of, with its instance"},
    {"EntityID", kInteger, "entity ID"},
    {"EntityInstance", kInteger, "entity instance"},
    {"EntityIsDeviceRelative", kBoolean, "the instance counts within a device"},
    {"Manufacturer", kText, "of the product, else of the board; of the memory module"},
    {"Product", kText, "name of the product, else of the board"},
    {"PartNumber", kText, "to order by: the product's, else the board's; the memory module's"},
    {"SerialNumber", kText, "the product's, else the board's; the memory module's"},
    {"ChassisType", kText, "type of the chassis"},
    {"ChassisPartNumber", kText, "chassis area: part number"},
    {"ChassisSerialNumber", kText, "chassis area: serial number"},
    {"ChassisCustom", kTextList, "chassis area: further fields"},
    {"BoardManufactured", kTime, "board area: when it was made"},
    {"BoardManufacturer", kText, "board area: manufacturer"},
    {"BoardProduct", kText, "board area: product name"},
    {"BoardSerialNumber", kText, "board area: serial number"},
    {"BoardPartNumber", kText, "board area: part number"},
    {"BoardFRUFile", kText, "board area: FRU file ID"},
    {"BoardCustom", kTextList, "board area: further fields"},
    {"ProductManufacturer", kText, "product area: manufacturer"},
    {"ProductName", kText, "product area: product name"},
    {"ProductPartNumber", kText, "product area: part or model number"},
    {"ProductVersion", kText, "product area: version"},
    {"ProductSerialNumber", kText, "product area: serial number"},
    {"ProductAssetTag", kText, "product area: asset tag"},
    {"ProductFRUFile", kText, "product area: FRU file ID"},
    {"ProductCustom", kTextList, "product area: further fields"},
    {"MultiRecords", kTextList, "multi-records: name, then each value with its unit"},
    {"ModuleManufacturer", kText, "memory module: manufacturer"},
    {"ModulePartNumber", kText, "memory module: part number"},
    {"ModuleSerialNumber", kText, "memory module: serial number"},
    {"ModuleManufactured", kText, "memory module: year and week in which it was made"},
    {"ModuleType", kText, "memory module: DDR2, DDR3 or DDR4"},
    {"ModuleSizeMiB", kInteger, "memory module: size in MiB"},
    {"Problems", kTextList, "what is wrong with the device's data or could not be read"},
};

void WriteEntity(const FruDevice& device, Output& output) {
    if (device.entities.empty()) return;
    const ipmi::Entity& entity = device.entities.front().entity;
    if (!entity.IsSpecified()) return;
    output.Text("Entity", ipmi::EntityText(entity.id, entity.instance));
    output.Integer("EntityID", entity.id);
    output.Integer("EntityInstance", entity.instance);
    output.Boolean("EntityIsDeviceRelative", entity.IsDeviceRelative());
}

void WriteInventory(const ipmi::FruInventory& inventory, Output& output) {
    if (const auto& chassis = inventory.chassis) {
        output.Text("ChassisType", ipmi::ChassisTypeName(chassis->type));
        output.Text("ChassisPartNumber", chassis->partNumber);
        output.Text("ChassisSerialNumber", chassis->serialNumber);
        output.Texts("ChassisCustom", chassis->custom);
    }
    if (const auto& board = inventory.board) {
        output.Time("BoardManufactured", board->manufactured);
        output.Text("BoardManufacturer", board->manufacturer);
        output.Text("BoardProduct", board->product);
        output.Text("BoardSerialNumber", board->serialNumber);
        output.Text("BoardPartNumber", board->partNumber);
        output.Text("BoardFRUFile", board->fruFile);
        output.Texts("BoardCustom", board->custom);
    }
    if (const auto& product = inventory.product) {
        output.Text("ProductManufacturer", product->manufacturer);
        output.Text("ProductName", product->name);
        output.Text("ProductPartNumber", product->partNumber);
        output.Text("ProductVersion", product->version);
        output.Text("ProductSerialNumber", product->serialNumber);
        output.Text("ProductAssetTag", product->assetTag);
        output.Text("ProductFRUFile", product->fruFile);
        output.Texts("ProductCustom", product->custom);
    }
    std::vector<std::string> records;
    for (const ipmi::FruMultiRecord& record : inventory.multiRecords) {
        records.push_back(ipmi::MultiRecordText(record));
    }
    output.Texts("MultiRecords", records);
}

void WriteModule(const ipmi::MemoryModule& module, Output& output) {
    output.Text("ModuleManufacturer", module.manufacturer);
    output.Text("ModulePartNumber", module.partNumber);
    output.Text("ModuleSerialNumber", module.serialNumber);
    if (module.manufactured) {
        output.Text("ModuleManufactured", ipmi::YearWeekText(*module.manufactured));
    }
    output.Text("ModuleType", module.type);
    output.Integer("ModuleSizeMiB", module.sizeMiB);
}

void WriteDevices(NodePass& pass, Output& output) {
    for (const FruDevice& device : pass.FruDevices()) {
        if (!output.Begin(kFruClass.info.name)) return;
        output.Integer("Node", pass.node().number());
        output.Integer("DeviceID", device.deviceId);
        if (device.controllerAddress != ipmi::kBmcAddress) {
            output.Integer("ControllerAddress", device.controllerAddress);
        }
        output.Text("Name", device.name);
        WriteEntity(device, output);
        output.Text("Manufacturer", device.Manufacturer());
        output.Text("Product", device.Product());
        output.Text("PartNumber", device.PartNumber());
        output.Text("SerialNumber", device.SerialNumber());
        if (device.inventory) WriteInventory(*device.inventory, output);
        if (device.module) WriteModule(*device.module, output);
        output.Texts("Problems", device.problems);
        output.End();
    }
}

}  // namespace

const ClassEntry kFruClass{
    .info = {.name = "IPMI_FRU",
             .description = "the inventory of each FRU device: chassis, board, product, module",
             .marks = NQORTQR20::kByDefault | NQORTQR20::kReadsSensors,
             .nodeProperty = "Node",
             .exporter = nullptr,
             .properties = kProperties,
             .propertyCount = std::size(kProperties)},
    .write = WriteDevices,
    .announce = [](NodePass& pass) { pass.AnnounceInventory(); }};

}  // namespace standard
