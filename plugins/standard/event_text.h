#pragma once

#include <cstddef>
#include <functional>
#include <map>
#include <optional>
#include <span>
#include <string>

#include "plugins/standard/event.h"

namespace standard {

/// Joins the pieces of Linux panic texts: the first piece of a panic gets the whole text, the
/// others say whose continuation they are. The texts by the places of the events.
std::map<std::size_t, std::string> JoinPanics(std::span<LoggedEvent> events);

/// The value of a raw reading or threshold of a sensor in its unit, where there is one.
using Converter =
    std::function<std::optional<double>(const ipmi::Sensor& sensor, std::uint8_t raw)>;
/// By the sensor's record alone: none for a sensor that is not linear.
std::optional<double> ConvertByRecord(const ipmi::Sensor& sensor, std::uint8_t raw);

/// Sets reading, threshold and unit of a threshold event.
void SetReading(const Converter& convert, Event* event);

/// Sets what happened in words, and the bytes that are the vendor's. A piece of a panic has its
/// text already.
void SetText(Event* event);

/// Sets the line for a person: part, sensor, what happened, reading and threshold.
void SetSentence(Event* event);

/// "3.312", "-40": at most three decimals, none that are 0; three digits of a value below 0.01.
std::string NumberText(double value);
/// The part in words, "Power Supply 1" or "one of DIMM_A1, DIMM_A2"; empty when there is none.
std::string PartText(const PartEvidence& evidence);
/// What an event's sensor is called: its name, else its type and number; empty for a record that is
/// no sensor event.
std::string SensorText(const Event& event);
/// Part and sensor, which stand before what happened; a name that both have once, a sensor without
/// a name only where there is no part: "PS 2, PS 2 Status", "Inlet Temp (one of Riser 1, Riser 2)".
std::string SubjectText(const Event& event);

}  // namespace standard
