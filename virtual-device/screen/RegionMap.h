// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QImage>
#include <QRect>
#include <QString>
#include <QStringList>

#include <span>
#include <string_view>

namespace VirtualDevice
{

/// What colour a region shows to somebody who looks at it from across the room.
enum class RegionColour
{
    None,  ///< there is no picture
    Green, ///< #008000: works, or the key is held
    Red,   ///< #ff0000: failed
    White, ///< #ffffff: idle, or the key is released
    Other, ///< anything else, such as the window's own grey
};

/// A rectangle of the window, in pixels from the window's upper left corner.
struct Region
{
    std::string_view name;
    int x;
    int y;
    int width;
    int height;
    std::string_view widget; ///< what is shown there: "CLASS/objectName" in the program
    std::string_view help;

    [[nodiscard]] constexpr bool isIn(int right, int bottom) const
    {
        return x >= 0 && y >= 0 && width > 0 && height > 0 && x + width <= right && y + height <= bottom;
    }
    [[nodiscard]] QRect rectangle() const { return {x, y, width, height}; }
};

/// Where each part of the window is, and what colour it has.
///
/// Threads: no state; any thread.
class RegionMap
{
public:
    RegionMap() = delete;

    static constexpr int windowWidth = 240;
    static constexpr int windowHeight = 320;

    [[nodiscard]] static std::span<const Region> regions();
    [[nodiscard]] static const Region* find(const QString& name);
    [[nodiscard]] static QStringList names();

    /// The colour that more pixels of the rectangle have than any other, which is the background behind a label's text.
    [[nodiscard]] static RegionColour dominantColour(const QImage& picture, const QRect& rectangle);

    [[nodiscard]] static QString word(RegionColour colour);
    [[nodiscard]] static QStringList words();
};

} // namespace VirtualDevice
