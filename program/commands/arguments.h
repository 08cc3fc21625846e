#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <vector>

// What an argument of the command line has to be. CLI11 puts the message behind the option's name.

namespace ipmisel {

/// One of these names; the help lists them unless told otherwise.
CLI::Validator OneOf(std::vector<std::string> names, bool listInHelp = true);
/// Seconds, more than none and at most so many.
CLI::Validator Seconds(double max);
CLI::Validator Number(int min, int max);
/// Any number, whose range is looked at elsewhere.
CLI::Validator Number();
/// A text that is not empty, else this message.
CLI::Validator NotEmpty(const std::string& message);
CLI::Validator FileName();

/// That this option goes with --store, which may also stand in the configuration. Throws Failure.
void RequireStore(bool hasStore, const char* option);

constexpr double kSecondsPerDay = 24 * 60 * 60;

/// The names of a table whose rows have one.
template <typename Table>
std::vector<std::string> Names(const Table& table) {
    std::vector<std::string> names;
    for (const auto& row : table) names.emplace_back(row.name);
    return names;
}

}  // namespace ipmisel
