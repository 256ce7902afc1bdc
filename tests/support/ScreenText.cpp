// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/ScreenText.h"

#include <QFontMetrics>
#include <QHash>
#include <QPainter>

#include <algorithm>

namespace TestSupport
{

namespace
{

constexpr int usualPoints = 9;
constexpr int largePoints = 12;
constexpr int fractions = 64; ///< of a pixel: the positions that the toolkit tells apart

QRgb backgroundOf(const QImage& picture)
{
    QHash<QRgb, int> counts;
    for (int y = 0; y < picture.height(); ++y)
        for (int x = 0; x < picture.width(); ++x)
            ++counts[picture.pixel(x, y)];
    return std::max_element(counts.begin(), counts.end()).key();
}

/// Without the margins that hold nothing but the background.
QImage trimmed(const QImage& picture, QRgb background)
{
    QRect used;
    for (int y = 0; y < picture.height(); ++y)
        for (int x = 0; x < picture.width(); ++x)
            if (picture.pixel(x, y) != background)
                used |= QRect(x, y, 1, 1);
    return picture.copy(used);
}

/// Beginning `fraction` of a pixel behind a whole one.
QImage painted(const QString& text, const QFont& font, QRgb background, double fraction)
{
    const QFontMetrics metrics(font);
    const int margin = metrics.height();
    QImage picture(metrics.horizontalAdvance(text) + 2 * margin, 3 * margin, QImage::Format_RGB32);
    picture.fill(background);
    QPainter painter(&picture);
    painter.setFont(font);
    painter.setPen(Qt::black);
    painter.drawText(QPointF(margin + fraction, 2 * margin), text);
    painter.end();
    return trimmed(picture, background);
}

} // namespace

void ScreenText::prepare()
{
    qputenv("QT_FONT_DPI", "96");
}

QFont ScreenText::usual()
{
    QFont font;
    font.setPointSize(usualPoints);
    return font;
}

QFont ScreenText::large(bool isBold)
{
    QFont font;
    font.setPointSize(largePoints);
    font.setBold(isBold);
    return font;
}

QFont ScreenText::named()
{
    return QFont(QStringLiteral("DejaVu Sans"), usualPoints);
}

bool ScreenText::isAt(const QImage& picture, const QRect& area, const QString& text, const QFont& font)
{
    const QImage seen = picture.copy(area).convertToFormat(QImage::Format_RGB32);
    if (seen.isNull())
        return false;
    const QRgb background = backgroundOf(seen);
    const QImage found = trimmed(seen, background);
    // Text that is centred begins between two pixels, and where its letters come to stand follows from that.
    for (int step = 0; step < fractions; ++step)
        if (found == painted(text, font, background, double(step) / fractions))
            return true;
    return false;
}

} // namespace TestSupport
