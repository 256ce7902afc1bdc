// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QFont>
#include <QImage>
#include <QRect>
#include <QString>

namespace TestSupport
{

/// Reads a picture of the device's screen the other way round: paints the text that should stand there, as the program
/// paints it, and compares the pixels. Whatever else is in the area, a single pixel, is a difference.
///
/// Needs a QGuiApplication with the program's resolution (`ScreenText::prepare` before it is made).
class ScreenText
{
public:
    /// What makes a point as many pixels here as it is on the device.
    static void prepare();
    /// The font of the program's labels, unless they have one of their own.
    [[nodiscard]] static QFont usual();
    [[nodiscard]] static QFont large(bool isBold = false);
    /// The one of the labels that name their family.
    [[nodiscard]] static QFont named();

    /// That the area holds this text, black on one colour, and nothing else.
    [[nodiscard]] static bool isAt(const QImage& picture, const QRect& area, const QString& text,
                                   const QFont& font = usual());
};

} // namespace TestSupport
