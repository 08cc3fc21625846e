#pragma once

#include <compare>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "ipmi/fru_inventory.h"
#include "ipmi/sdr_record.h"
#include "ipmi/spd.h"
#include "plugins/standard/controller.h"

namespace standard {

/// An entity as it is told apart in a whole system: one that is relative to a device by the address
/// and channel of that device too.
struct EntityKey {
    ipmi::Entity entity;
    std::uint8_t address = 0;
    std::uint8_t channel = 0;

    EntityKey() = default;
    EntityKey(const ipmi::Entity& which, std::uint8_t deviceAddress, std::uint8_t deviceChannel)
        : entity(which),
          address(which.IsDeviceRelative() ? deviceAddress : std::uint8_t{0}),
          channel(which.IsDeviceRelative() ? deviceChannel : std::uint8_t{0}) {}
    auto operator<=>(const EntityKey&) const = default;
};

/// The controller's own inventory (IPMI 2.0, clause 34).
constexpr std::uint8_t kOwnFruDevice = 0;

/// A FRU device and what it holds: an inventory, or the presence detect data of a memory module.
struct FruDevice {
    std::uint8_t deviceId = kOwnFruDevice;
    std::uint8_t controllerAddress = ipmi::kBmcAddress;  ///< through which it is reached
    std::string name;                                    ///< of its locator; empty without one
    std::vector<EntityKey> entities;  ///< that it is the inventory of; of every locator
    std::optional<ipmi::FruInventory> inventory;
    std::optional<ipmi::MemoryModule> module;
    std::vector<std::string> problems;  ///< of the reading and of what was read

    // The ones to order by: the module's, the product's, else the board's. Empty when not known;
    // so is what is filled with one character, as with zeros or dots.
    std::string Manufacturer() const;
    std::string Product() const;
    std::string PartNumber() const;
    std::string SerialNumber() const;
    /// Whether the checksums of what was read are right.
    bool IsSound() const;
};

/// The controller's own FRU device 0, without what a locator tells of it. Get FRU Inventory Area
/// Info comes first, then all of the device is read. Empty for a device that is not there, by the
/// controller's own answer.
/// What ReadFruDevices begins with.
std::vector<ipmi::Command> FruAreaCommands(const std::vector<ipmi::SdrRecord>& repository);
std::optional<FruDevice> ReadOwnFruDevice(Controller& controller);

/// The FRU devices of a controller: `own`, as ReadOwnFruDevice had it, then the logical devices of
/// the locators in their order, read in the same way. One behind another controller is listed and
/// not read, since its number means another device here.
std::vector<FruDevice> ReadFruDevices(Controller& controller,
                                      const std::vector<ipmi::SdrRecord>& repository,
                                      const std::optional<FruDevice>& own);

}  // namespace standard
