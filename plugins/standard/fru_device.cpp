#include "plugins/standard/fru_device.h"

#include <algorithm>
#include <chrono>
#include <span>
#include <string_view>
#include <thread>
#include <utility>
#include <variant>

#include "base/text.h"
#include "ipmi/fru_device_reader.h"

namespace standard {
namespace {

using ipmisel::Format;

/// A text of one character throughout, which stands where nobody has written anything.
bool IsFiller(std::string_view text) {
    constexpr std::string_view kFillers = "0._-*#?xX";
    return !text.empty() && kFillers.find(text[0]) != std::string_view::npos &&
           text.find_first_not_of(text[0]) == std::string_view::npos;
}

/// The first of the texts that says something.
std::string First(const std::string& one, const std::string& other) {
    if (!one.empty() && !IsFiller(one)) return one;
    return IsFiller(other) ? std::string() : other;
}

std::string CodeText(const std::optional<Answer>& answer) {
    return answer ? Format("completion code %02xh", answer->completionCode) : "no answer";
}

/// A device and the LUN of its commands.
struct Place {
    FruDevice device;
    std::uint8_t lun = ipmi::kBmcLun;

    bool IsHere() const { return device.controllerAddress == ipmi::kBmcAddress; }
};

std::vector<Place> FindDevices(const std::vector<ipmi::SdrRecord>& repository) {
    constexpr std::uint8_t kNoDevice = 0xFF;
    std::vector<Place> places(1);
    // The controller's own inventory is that of the entity which its locator names.
    for (const ipmi::SdrRecord& record : repository) {
        const auto* const locator = std::get_if<ipmi::ControllerLocator>(&record.body);
        if (locator == nullptr || locator->slaveAddress != ipmi::kBmcAddress) continue;
        places[0].device.entities.emplace_back(locator->entity, locator->slaveAddress,
                                               locator->channel);
    }
    for (const ipmi::SdrRecord& record : repository) {
        const auto* const locator = std::get_if<ipmi::FruLocator>(&record.body);
        if (locator == nullptr || !locator->isLogical || locator->deviceId == kNoDevice) continue;
        auto place = std::find_if(places.begin(), places.end(), [&](const Place& known) {
            return known.device.deviceId == locator->deviceId &&
                   known.device.controllerAddress == locator->accessAddress;
        });
        if (place == places.end()) {
            place = places.emplace(places.end());
            place->device.deviceId = locator->deviceId;
            place->device.controllerAddress = locator->accessAddress;
        }
        if (place->device.name.empty()) place->device.name = locator->name;
        place->lun = locator->lun;
        const EntityKey entity(locator->entity, locator->accessAddress, locator->channel);
        auto& entities = place->device.entities;
        // What a locator says of device 0 is nearer than what the controller's own one does.
        if (place == places.begin()) std::erase(entities, entity);
        if (std::find(entities.begin(), entities.end(), entity) == entities.end()) {
            entities.insert(place == places.begin() ? entities.begin() : entities.end(), entity);
        }
    }
    return places;
}

void Decode(FruDevice* device, const std::vector<std::uint8_t>& bytes, std::size_t size) {
    device->module = ipmi::ReadSpd(bytes);
    if (!device->module) device->inventory = ipmi::ReadFruInventory(bytes, size);
    const auto& problems = device->module ? device->module->problems : device->inventory->problems;
    device->problems.insert(device->problems.end(), problems.begin(), problems.end());
}

/// Sends the commands of one device. A device that is busy is asked again, after a pause that
/// doubles: it costs a third of a second at most.
class DeviceCommands {
public:
    DeviceCommands(Controller& controller, std::uint8_t lun) : controller_(controller), lun_(lun) {}

    std::optional<Answer> Send(ipmi::Command command) {
        command.lun = lun_;
        auto answer = controller_.Send(command);
        while (answer && IsBusy(answer->completionCode) && busy_ < kMaxBusy) {
            std::this_thread::sleep_for(kFirstPause * (1 << busy_++));
            answer = controller_.Send(command);
        }
        return answer;
    }

private:
    static constexpr std::chrono::milliseconds kFirstPause{10};
    static constexpr int kMaxBusy = 5;

    static bool IsBusy(std::uint8_t completionCode) {
        return completionCode == ipmi::kFruDeviceBusy || completionCode == ipmi::kNodeBusy;
    }

    Controller& controller_;
    std::uint8_t lun_;
    int busy_ = 0;  ///< how often it was
};

/// Reads a device; false when it is not there.
bool Read(Controller& controller, Place* place) {
    FruDevice& device = place->device;
    DeviceCommands commands(controller, place->lun);
    const auto answer = commands.Send(ipmi::GetFruInventoryAreaInfo(device.deviceId));
    if (answer && (answer->completionCode == ipmi::kNotPresent ||
                   answer->completionCode == ipmi::kInvalidCommand)) {
        return false;
    }
    const auto info = answer && answer->Completed() ? ipmi::ParseFruAreaInfo(answer->data)
                                                    : std::optional<ipmi::FruAreaInfo>();
    if (!info) {
        device.problems.push_back("Get FRU Inventory Area Info: " + (answer && answer->Completed()
                                                                         ? "a short answer"
                                                                         : CodeText(answer)));
        return true;
    }
    ipmi::FruDeviceReader reader(device.deviceId, *info);
    std::optional<Answer> last;
    while (const auto command = reader.NextRequest()) {
        last = commands.Send(*command);
        if (!last) break;
        reader.TakeAnswer(last->completionCode, last->data);
    }
    const std::size_t read = reader.bytes().size();
    if (!reader.complete()) {
        // An absent device may well have a size: what stands in its place gives it.
        if (read == 0 && last && last->completionCode == ipmi::kNotPresent) return false;
        device.problems.push_back(
            Format("%zu of %u bytes could be read: ", read, unsigned{info->size}) +
            (last && last->Completed() ? "a short answer" : CodeText(last)));
        if (read == 0) return true;
    }
    Decode(&device, reader.bytes(), info->size);
    return true;
}

}  // namespace

std::string FruDevice::Manufacturer() const {
    if (module) return module->manufacturer;
    if (!inventory) return {};
    return First(inventory->product ? inventory->product->manufacturer : "",
                 inventory->board ? inventory->board->manufacturer : "");
}

std::string FruDevice::Product() const {
    if (!inventory) return {};
    return First(inventory->product ? inventory->product->name : "",
                 inventory->board ? inventory->board->product : "");
}

std::string FruDevice::PartNumber() const {
    if (module) return module->partNumber;
    if (!inventory) return {};
    return First(inventory->product ? inventory->product->partNumber : "",
                 inventory->board ? inventory->board->partNumber : "");
}

std::string FruDevice::SerialNumber() const {
    if (module) return module->serialNumber;
    if (!inventory) return {};
    return First(inventory->product ? inventory->product->serialNumber : "",
                 inventory->board ? inventory->board->serialNumber : "");
}

bool FruDevice::IsSound() const {
    return (module && module->problems.empty()) || (inventory && inventory->sound);
}

std::optional<FruDevice> ReadOwnFruDevice(Controller& controller) {
    Place place;
    if (!Read(controller, &place)) return std::nullopt;
    return std::move(place.device);
}

std::vector<ipmi::Command> FruAreaCommands(const std::vector<ipmi::SdrRecord>& repository) {
    std::vector<ipmi::Command> commands;
    const std::vector<Place> places = FindDevices(repository);
    for (const Place& place : std::span(places).subspan(1)) {
        if (!place.IsHere()) continue;
        commands.push_back(ipmi::GetFruInventoryAreaInfo(place.device.deviceId));
        commands.back().lun = place.lun;
    }
    return commands;
}

std::vector<FruDevice> ReadFruDevices(Controller& controller,
                                      const std::vector<ipmi::SdrRecord>& repository,
                                      const std::optional<FruDevice>& own) {
    std::vector<Place> places = FindDevices(repository);
    std::vector<FruDevice> devices;
    if (own) {
        FruDevice& device = devices.emplace_back(*own);
        device.name = std::move(places[0].device.name);
        device.entities = std::move(places[0].device.entities);
    }
    for (Place& place : std::span(places).subspan(1)) {
        if (!place.IsHere()) {
            place.device.problems.push_back(
                Format("behind the controller at %02xh: not read", place.device.controllerAddress));
        }
        if (!place.IsHere() || Read(controller, &place)) devices.push_back(std::move(place.device));
    }
    return devices;
}

}  // namespace standard
