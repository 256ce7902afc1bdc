// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"
#include "tests/support/ScreenHealth.h"
#include "tests/support/ScreenText.h"

#include <QTest>

using TestSupport::DeviceUnderTest;
using TestSupport::ScreenHealth;
using TestSupport::ScreenText;

namespace
{

constexpr QRgb black = 0xff000000;
constexpr QRgb green = 0xff008000;
constexpr QRgb red = 0xffff0000;
constexpr QRgb white = 0xffffffff;

// The layout of the window.
constexpr QRect rtcRegion(0, 0, 240, 30);
constexpr QRect buttonsRegion(0, 32, 240, 62);
constexpr QRect usbDeviceRegion(0, 94, 120, 25);
constexpr QRect usbGadgetRegion(120, 94, 120, 25);
constexpr QRect fuelGaugeRegion(0, 119, 240, 75);
constexpr QRect triggerRegion(0, 220, 120, 18);
constexpr QRect sdCardRegion(120, 220, 120, 18);
constexpr QRect rfRegion(0, 237, 240, 83);
/// Where the keys' labels are laid out.
constexpr QRect keyGrid(0, 32, 231, 61);

QRgb colourAt(const QImage& picture, const QPoint& point)
{
    return picture.pixel(point) | 0xff000000;
}

QRgb backgroundOf(const QImage& picture)
{
    return colourAt(picture, {120, 207}); // in the band that no test fills
}

/// The smallest rectangle around the pixels within the area that differ.
QRect changed(const QImage& before, const QImage& after, const QRect& area)
{
    QRect box;
    for (int y = area.top(); y <= area.bottom(); ++y)
        for (int x = area.left(); x <= area.right(); ++x)
            if (before.pixel(x, y) != after.pixel(x, y))
                box |= QRect(x, y, 1, 1);
    return box;
}

int count(const QImage& picture, const QRect& area, QRgb colour)
{
    int found = 0;
    for (int y = area.top(); y <= area.bottom(); ++y)
        for (int x = area.left(); x <= area.right(); ++x)
            found += colourAt(picture, {x, y}) == colour ? 1 : 0;
    return found;
}

bool isFilledWith(const QImage& picture, const QRect& area, QRgb colour)
{
    return count(picture, area, colour) == area.width() * area.height();
}

/// A closed line of one pixel along the inside of the rectangle.
bool isFramedIn(const QImage& picture, const QRect& area, QRgb colour)
{
    const QRect inside = area.adjusted(1, 1, -1, -1);
    const int border = area.width() * area.height() - inside.width() * inside.height();
    return count(picture, area, colour) - count(picture, inside, colour) == border;
}

} // namespace

/// Every region to the pixel, in the picture that the device's screen shows.
class GeometrySystemTest : public QObject
{
    Q_OBJECT

public:
    static void initMain() { ScreenText::prepare(); }

private slots:
    void initTestCase();
    void init();

    void theWindowFillsTheScreen();
    void whatNoTestFillsIsBlank_data();
    void whatNoTestFillsIsBlank();
    void aLabelFillsItsRegionAndNothingElse_data();
    void aLabelFillsItsRegionAndNothingElse();
    void theKeysLieInTheirGrid();
    void theFuelGaugeFillsItsRegion();
    void theRadioPanelStaysInItsRegion();
    void theRadioPanelsLabelsStandOneOverTheOther();
    void theClockFillsItsRegion();

private:
    [[nodiscard]] QRect boxThatTurns(const QString& region, const QRect& around, const QString& control,
                                     const QJsonValue& broken);
    [[nodiscard]] QRect keyLabel(const QString& key, const QString& region);

    DeviceUnderTest device;
};

void GeometrySystemTest::initTestCase()
{
    REQUIRE(device.start());
}

void GeometrySystemTest::init()
{
    REQUIRE(ScreenHealth::isReached(device));
}

/// What changes on the screen when the region turns red; null when it does not.
QRect GeometrySystemTest::boxThatTurns(const QString& region, const QRect& around, const QString& control,
                                       const QJsonValue& broken)
{
    const QJsonValue whole = device.get(control);
    const QImage before = device.screenshot();
    const bool hasTurned = device.set(control, broken) && device.waitRegion(region, "red");
    const QImage after = device.screenshot();
    const bool isBack = device.set(control, whole) && device.waitRegion(region, "green");
    return hasTurned && isBack ? changed(before, after, around) : QRect();
}

QRect GeometrySystemTest::keyLabel(const QString& key, const QString& region)
{
    const QImage before = device.screenshot();
    const bool isHeld = device.press(key) && device.waitRegion(region, "green");
    const QImage held = device.screenshot();
    const bool isBack = device.release(key) && device.waitRegion(region, "white");
    return isHeld && isBack ? changed(before, held, buttonsRegion).adjusted(-1, -1, 1, 1) : QRect();
}

void GeometrySystemTest::theWindowFillsTheScreen()
{
    const QImage picture = device.screenshot();
    QCOMPARE(picture.size(), QSize(240, 320));
    // Black is what the screen is where no window is.
    QCOMPARE(count(picture, QRect(0, 319, 240, 1), black), 0);
    QVERIFY(backgroundOf(picture) != black);
}

void GeometrySystemTest::whatNoTestFillsIsBlank_data()
{
    QTest::addColumn<QRect>("area");
    QTest::addRow("between clock and keys") << QRect(0, 30, 240, 2);
    QTest::addRow("beside the keys") << QRect(231, 32, 9, 62);
    QTest::addRow("below the keys") << QRect(0, 93, 240, 1);
    QTest::addRow("below the gauge") << QRect(0, 194, 240, 26);
    QTest::addRow("the radio panel's first rows") << QRect(0, 238, 240, 2);
}

void GeometrySystemTest::whatNoTestFillsIsBlank()
{
    QFETCH(const QRect, area);
    const QImage picture = device.screenshot();
    QVERIFY(isFilledWith(picture, area, backgroundOf(picture)));
}

void GeometrySystemTest::aLabelFillsItsRegionAndNothingElse_data()
{
    QTest::addColumn<QRect>("region");
    QTest::addColumn<QString>("name");
    QTest::addColumn<QString>("text");
    QTest::addColumn<QFont>("font");
    QTest::addColumn<QString>("control");
    QTest::addColumn<QJsonValue>("broken");
    const auto row = [](const QRect& region, const char* name, const char* text, const QFont& font, const char* control,
                        const QJsonValue& broken) {
        QTest::addRow("%s", name) << region << name << text << font << control << broken;
    };
    row(usbDeviceRegion, "usb-device", "HID Device", ScreenText::named(), "usb.hid", false);
    row(usbGadgetRegion, "usb-gadget", "HID Gadget", ScreenText::named(), "usb.gadget", false);
    row(triggerRegion, "trigger", "Trigger", ScreenText::usual(), "trigger.period", 0);
    row(sdCardRegion, "sd-card", "SD Card", ScreenText::usual(), "sd.present", false);
}

/// The frame is the region's outermost line; inside it everything but the letters turns, and outside nothing does.
void GeometrySystemTest::aLabelFillsItsRegionAndNothingElse()
{
    QFETCH(const QRect, region);
    QFETCH(const QString, name);
    QFETCH(const QString, text);
    QFETCH(const QFont, font);
    QFETCH(const QString, control);
    QFETCH(const QJsonValue, broken);
    const QImage healthy = device.screenshot();
    QCOMPARE(colourAt(healthy, region.topLeft()), black);
    QCOMPARE(colourAt(healthy, region.topLeft() + QPoint(2, 2)), green);
    QVERIFY(isFramedIn(healthy, region, black));
    QVERIFY(ScreenText::isAt(healthy, region.adjusted(1, 1, -1, -1), text, font));
    QCOMPARE(count(healthy, QRect(region.x(), region.y() - 1, region.width(), 1), black), 0);
    QCOMPARE(count(healthy, QRect(region.x(), region.bottom() + 1, region.width(), 1), black), 0);
    const QRect around = region.adjusted(-4, -4, 4, 4) & healthy.rect();
    QCOMPARE(boxThatTurns(name, around, control, broken), region.adjusted(1, 1, -1, -1));
}

void GeometrySystemTest::theKeysLieInTheirGrid()
{
    constexpr std::array keys{"Soft1", "Soft2", "Soft3", "Sel", "Up", "Down", "Left", "Right", "Power"};
    QList<QRect> labels;
    for (const auto* const key : keys)
        labels.append(keyLabel(key, QStringLiteral("key.%1").arg(QString::fromLatin1(key).toLower())));
    // These two switched the transmission and the antenna.
    REQUIRE(device.strike("Sel", "key.sel"));
    REQUIRE(device.strike("Soft3", "key.soft3"));
    REQUIRE(device.waitControl("radio.amplifier", true));
    REQUIRE(device.waitControl("dsp.receiver", 1));
    const QImage picture = device.screenshot();
    QRect all;
    for (const auto& label : std::as_const(labels)) {
        QVERIFY(keyGrid.contains(label));
        QVERIFY(isFramedIn(picture, label, black));
        QCOMPARE(colourAt(picture, label.topLeft() + QPoint(2, 2)), white);
        all |= label;
    }
    QCOMPARE(all.topLeft(), keyGrid.topLeft());
    QCOMPARE(all.right(), keyGrid.right());
    QCOMPARE(all.bottom(), keyGrid.bottom());
    // Rows and columns.
    for (int key = 0; key < 8; ++key) {
        QCOMPARE(labels.at(key).top(), labels.at(key / 4 * 4).top());
        QCOMPARE(labels.at(key).left(), labels.at(key % 4).left());
        QVERIFY(ScreenText::isAt(picture, labels.at(key).adjusted(1, 1, -1, -1), keys.at(static_cast<std::size_t>(key)),
                                 ScreenText::named()));
    }
    // What is left of the last row is the label of unknown keys.
    const QRect unknown(QPoint(labels.at(1).left(), labels.at(8).top()), keyGrid.bottomRight());
    QVERIFY(isFramedIn(picture, unknown, black));
    QVERIFY(ScreenText::isAt(picture, unknown.adjusted(1, 1, -1, -1), "Unknown:", ScreenText::named()));
}

/// A group box: its frame is a line in the middle of the title and the region's outermost lines elsewhere.
void GeometrySystemTest::theFuelGaugeFillsItsRegion()
{
    const QImage picture = device.screenshot();
    const QRgb background = backgroundOf(picture);
    const QRect below(fuelGaugeRegion.x(), fuelGaugeRegion.bottom(), fuelGaugeRegion.width(), 1);
    const QRect left(fuelGaugeRegion.x(), fuelGaugeRegion.center().y(), 1, fuelGaugeRegion.height() / 2);
    QCOMPARE(count(picture, below, background), 0);
    QCOMPARE(count(picture, left, background), 0);
    QCOMPARE(count(picture, left.translated(fuelGaugeRegion.width() - 1, 0), background), 0);
    // The fields inside it: 5 pixels from its sides, one below the other.
    for (const auto& field : {QRect(5, 139, 230, 25), QRect(5, 164, 230, 25)}) {
        const QRect shade(field.topLeft(), QSize(field.width() - 1, 1));
        QVERIFY(isFilledWith(picture, shade, colourAt(picture, field.topLeft())));
        QVERIFY(colourAt(picture, field.topLeft()) != background);
        QVERIFY(isFilledWith(picture, QRect(2, field.y(), 3, field.height()), background));
        QVERIFY(isFilledWith(picture, QRect(235, field.y(), 3, field.height()), background));
        QCOMPARE(count(picture, QRect(field.right(), field.y(), 1, field.height()), background), 0);
    }
}

void GeometrySystemTest::theRadioPanelStaysInItsRegion()
{
    const QImage before = device.screenshot();
    REQUIRE(device.tap("Up"));
    REQUIRE(device.waitControl("radio.channel", 40));
    REQUIRE(ScreenHealth::passesARound(device));
    const QImage after = device.screenshot();
    REQUIRE(device.tap("Down"));
    REQUIRE(device.waitControl("radio.channel", 2));
    // The clock, and nothing else, may change meanwhile.
    const QRect box = changed(before, after, before.rect().adjusted(0, rtcRegion.bottom() + 1, 0, 0));
    QVERIFY(!box.isEmpty());
    QVERIFY(rfRegion.contains(box));
}

void GeometrySystemTest::theRadioPanelsLabelsStandOneOverTheOther()
{
    const QRect panel = rfRegion.adjusted(0, 1, 0, 0); // the labels above it lie over its first row
    const QRect beacon = boxThatTurns("rf.beacon", QRect(153, 262, 87, 30), "radio.ack", "off");
    const QRect radios = boxThatTurns("rf.radios", QRect(153, 291, 87, 29), "radioline.period", 0);
    QVERIFY(panel.contains(beacon));
    QVERIFY(panel.contains(radios));
    QCOMPARE(beacon.left(), radios.left());
    QCOMPARE(beacon.width(), radios.width());
    QVERIFY(beacon.bottom() < radios.top());
    QVERIFY(beacon.left() > panel.center().x());
    const QImage picture = device.screenshot();
    for (const auto& label : {beacon, radios}) {
        QCOMPARE(colourAt(picture, label.topLeft()), green);
        QCOMPARE(colourAt(picture, label.bottomRight()), green);
        const QRgb background = backgroundOf(picture);
        QVERIFY(isFilledWith(picture, QRect(label.left() - 1, label.top(), 1, label.height()), background));
        QVERIFY(isFilledWith(picture, QRect(label.right() + 1, label.top(), 1, label.height()), background));
        QVERIFY(isFilledWith(picture, QRect(label.left(), label.bottom() + 1, label.width(), 1), background));
    }
    QVERIFY(ScreenText::isAt(picture, beacon, "Beacon Micro"));
    QVERIFY(ScreenText::isAt(picture, radios, "Internal RF"));
}

/// The last test of the run: the field stays red. Its frame is shaded red, too, so that the whole region turns.
void GeometrySystemTest::theClockFillsItsRegion()
{
    REQUIRE(device.set("rtc.running", false));
    REQUIRE(device.set("rtc.time", 1299510245));
    QTRY_VERIFY_WITH_TIMEOUT(ScreenText::isAt(device.screenshot(), rtcRegion.adjusted(4, 4, -4, -4),
                                              "3/7/11 3:04:05 PM", ScreenText::named()),
                             20000);
    const QImage before = device.screenshot();
    QCOMPARE(colourAt(before, {3, 3}), white);
    REQUIRE(device.set("rtc.fault", "EIO"));
    REQUIRE(device.waitRegion("rtc", "red"));
    const QImage after = device.screenshot();
    QCOMPARE(colourAt(after, {3, 3}), red);
    QCOMPARE(changed(before, after, QRect(0, 0, 240, 94)), rtcRegion);
}

QTEST_MAIN(GeometrySystemTest)
#include "GeometrySystemTest.moc"
