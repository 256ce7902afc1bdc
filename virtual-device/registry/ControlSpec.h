// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <cstdint>
#include <string_view>

namespace VirtualDevice
{

enum class ControlType
{
    Integer, ///< a JSON number without a fraction, within minimum..maximum
    Boolean, ///< true or false
    Choice,  ///< one of the words in `choices`
    Text,    ///< a string of at most `maximum` characters
};

enum class ControlAccess
{
    Operator, ///< set by whoever drives the device
    Device,   ///< read only: what the device has observed
};

/// One row of the control table: everything that the command line, the help, the documentation and the checks know
/// about a control.
///
/// Threads: a constant; any.
struct ControlSpec
{
    std::string_view name;
    ControlType type = ControlType::Integer;
    ControlAccess access = ControlAccess::Operator;
    std::string_view unit;
    std::int64_t minimum = 0;
    std::int64_t maximum = 0;
    std::string_view choices; ///< words separated by "|", for Choice
    std::string_view initial; ///< as a person would type it
    std::string_view help;
    std::string_view start; ///< what is in force at first where that is no constant
};

constexpr ControlSpec integerControl(std::string_view name, std::string_view unit, std::int64_t minimum,
                                     std::int64_t maximum, std::string_view initial, std::string_view help)
{
    return {name, ControlType::Integer, ControlAccess::Operator, unit, minimum, maximum, {}, initial, help, {}};
}

constexpr ControlSpec switchControl(std::string_view name, std::string_view initial, std::string_view help)
{
    return {name, ControlType::Boolean, ControlAccess::Operator, {}, 0, 1, {}, initial, help, {}};
}

constexpr ControlSpec choiceControl(std::string_view name, std::string_view choices, std::string_view initial,
                                    std::string_view help)
{
    return {name, ControlType::Choice, ControlAccess::Operator, {}, 0, 0, choices, initial, help, {}};
}

constexpr ControlSpec textControl(std::string_view name, std::int64_t longest, std::string_view initial,
                                  std::string_view help)
{
    return {name, ControlType::Text, ControlAccess::Operator, {}, 0, longest, {}, initial, help, {}};
}

/// The same row as something that the device reports and nobody sets.
constexpr ControlSpec reported(ControlSpec spec)
{
    spec.access = ControlAccess::Device;
    return spec;
}

/// The same row as something that the device itself gives a value when it starts.
constexpr ControlSpec startingWith(std::string_view start, ControlSpec spec)
{
    spec.start = start;
    return spec;
}

} // namespace VirtualDevice
