// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/screen/Screen.h"

#include "tests/virtual-device/SampleProgram.h"
#include "tests/virtual-device/Terminal.h"
#include "virtual-device/control/LiveTable.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/screen/KeyTable.h"
#include "virtual-device/screen/RegionMap.h"
#include "virtual-device/screen/RegionWatch.h"
#include "virtual-device/screen/SignalLines.h"

#include <QElapsedTimer>
#include <QSignalSpy>
#include <QTemporaryDir>
#include <QTest>

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <memory>

using namespace VirtualDevice;
using TestSupport::SampleProgram;
using TestSupport::Terminal;

namespace
{

constexpr int limit = 20000;

} // namespace

class ScreenTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();

    void pictureHasTheWindowsSizeAndColours();
    void noPictureAndNoKeyBeforeTheProgramStands();
    void everyKeyReachesTheProgramWithItsCode_data();
    void everyKeyReachesTheProgramWithItsCode();
    void namesOfAKeyMeanTheSameInAnyCase();
    void unknownKeyIsRefused();
    void heldKeyIsReleasedAfterItsTime();
    void labelOfAKeyIsGreenWhileItIsDown();
    void regionsFollowTheirLabels();
    void regionsHaveNoColourOnceTheProgramIsGone();
    void pngFileHoldsThePicture();
    void screenComesBackWithANewProgram();
    void signalLineArrivesAgainAndAgainUntilItIsSwitchedOff();
    void signalLineThatIsSetBeforeTheProgramStandsArrivesThen();
    void tableOnATerminalIsRedrawnWhenAColourChanges();
    void terminalThatTakesNothingHoldsNobodyUp();
    void terminalThatGoesAwayHoldsNobodyUp();
    void frozenProgramHoldsNobodyUp();
    void screenEndsWhileTheProgramIsFrozenInTheHandshake();

private:
    [[nodiscard]] bool waitForPicture() const;
    [[nodiscard]] bool waitForKeyEvents(const QStringList& expected);

    std::unique_ptr<SampleProgram> program;
    std::unique_ptr<Screen> screen;
    std::unique_ptr<RegionWatch> regions;
};

void ScreenTest::init()
{
    program = std::make_unique<SampleProgram>();
    screen = std::make_unique<Screen>();
    regions = std::make_unique<RegionWatch>(*screen);
    screen->open(program->socketPath());
    if (QByteArray(QTest::currentTestFunction()) == "noPictureAndNoKeyBeforeTheProgramStands")
        return;
    QVERIFY(program->start());
    QVERIFY(waitForPicture());
}

void ScreenTest::cleanup()
{
    regions.reset();
    screen.reset();
    program.reset();
}

bool ScreenTest::waitForPicture() const
{
    return QTest::qWaitFor([this] { return regions->colour("key.sel") == RegionColour::White; }, limit);
}

bool ScreenTest::waitForKeyEvents(const QStringList& expected)
{
    return QTest::qWaitFor([&] { return program->keyEvents().size() >= expected.size(); }, limit) &&
           program->keyEvents() == expected;
}

void ScreenTest::pictureHasTheWindowsSizeAndColours()
{
    const QImage picture = screen->picture();
    QCOMPARE(picture.size(), QSize(240, 320));
    QCOMPARE(picture.pixelColor(2, 96), QColor(255, 0, 0));
    QCOMPARE(picture.pixelColor(0, 94), QColor(0, 0, 0));
    QCOMPARE(picture.pixelColor(2, 34), QColor(255, 255, 255));
}

void ScreenTest::noPictureAndNoKeyBeforeTheProgramStands()
{
    QVERIFY(!screen->isConnected());
    QVERIFY(screen->picture().isNull());
    QVERIFY(screen->png().isEmpty());
    QVERIFY(!screen->press("F5"));
    QVERIFY(!screen->hold("F5", std::chrono::milliseconds(1)));
    QCOMPARE(regions->colour("trigger"), RegionColour::None);
    QVERIFY(program->start());
    QVERIFY(waitForPicture());
    QVERIFY(screen->isConnected());
}

void ScreenTest::everyKeyReachesTheProgramWithItsCode_data()
{
    QTest::addColumn<int>("code");
    QTest::addRow("Return") << int(Qt::Key_Return);
    QTest::addRow("Up") << int(Qt::Key_Up);
    QTest::addRow("Down") << int(Qt::Key_Down);
    QTest::addRow("Left") << int(Qt::Key_Left);
    QTest::addRow("Right") << int(Qt::Key_Right);
    QTest::addRow("F5") << int(Qt::Key_F5);
    QTest::addRow("F6") << int(Qt::Key_F6);
    QTest::addRow("F7") << int(Qt::Key_F7);
    QTest::addRow("F8") << int(Qt::Key_F8);
    QTest::addRow("F9") << int(Qt::Key_F9);
    QTest::addRow("F10") << int(Qt::Key_F10);
    QTest::addRow("F11") << int(Qt::Key_F11);
    QTest::addRow("F12") << int(Qt::Key_F12);
    QTest::addRow("Escape") << int(Qt::Key_Escape);
    QTest::addRow("Space") << int(Qt::Key_Space);
    QTest::addRow("x") << int(Qt::Key_X);
    QTest::addRow("7") << int(Qt::Key_7);
}

void ScreenTest::everyKeyReachesTheProgramWithItsCode()
{
    QFETCH(const int, code);
    QVERIFY(screen->press(QTest::currentDataTag()));
    QVERIFY(screen->release(QTest::currentDataTag()));
    QVERIFY(waitForKeyEvents({QString("press %1").arg(code), QString("release %1").arg(code)}));
}

void ScreenTest::namesOfAKeyMeanTheSameInAnyCase()
{
    QCOMPARE(KeyTable::symbol("soft1"), KeyTable::symbol("F5"));
    QCOMPARE(KeyTable::symbol("TRIGGER"), KeyTable::symbol("f10"));
    QCOMPARE(KeyTable::symbol("Radio"), KeyTable::symbol("F11"));
    QCOMPARE(KeyTable::symbol("Power"), KeyTable::symbol("F12"));
    QCOMPARE(KeyTable::symbol("Enter"), KeyTable::symbol("Return"));
    QCOMPARE(KeyTable::symbol("Q"), KeyTable::symbol("q"));
}

void ScreenTest::unknownKeyIsRefused()
{
    for (const auto* name : {"", "F13", "Soft4", "ab", "|", "Return|Enter", "\xc3\xa4"})
        QVERIFY2(!screen->press(QString::fromUtf8(name)), name);
    QVERIFY(screen->press("a"));
    QVERIFY(waitForKeyEvents({QString("press %1").arg(int(Qt::Key_A))}));
}

void ScreenTest::heldKeyIsReleasedAfterItsTime()
{
    constexpr std::chrono::milliseconds duration(300);
    QElapsedTimer clock;
    qint64 releasedAfter = 0;
    clock.start();
    QVERIFY(screen->hold("F5", duration, [&] { releasedAfter = clock.elapsed(); }));
    QVERIFY(waitForKeyEvents({QString("press %1").arg(int(Qt::Key_F5)), QString("release %1").arg(int(Qt::Key_F5))}));
    QVERIFY(releasedAfter >= duration.count());
}

void ScreenTest::labelOfAKeyIsGreenWhileItIsDown()
{
    QVERIFY(screen->press("Down"));
    QTRY_COMPARE_WITH_TIMEOUT(regions->colour("key.down"), RegionColour::Green, limit);
    QCOMPARE(regions->colour("key.up"), RegionColour::White);
    QVERIFY(screen->release("Down"));
    QTRY_COMPARE_WITH_TIMEOUT(regions->colour("key.down"), RegionColour::White, limit);
}

void ScreenTest::regionsFollowTheirLabels()
{
    const QStringList labels{"usb-device", "usb-gadget", "trigger", "sd-card", "rf.beacon", "rf.radios"};
    const auto allAre = [&](RegionColour colour) {
        return std::all_of(labels.begin(), labels.end(),
                           [&](const QString& name) { return regions->colour(name) == colour; });
    };
    QVERIFY(QTest::qWaitFor([&] { return allAre(RegionColour::Red); }, limit));
    QSignalSpy changes(regions.get(), &RegionWatch::changed);
    QVERIFY(screen->press("g"));
    QVERIFY(QTest::qWaitFor([&] { return allAre(RegionColour::Green); }, limit));
    QCOMPARE(changes.count(), labels.size());
    QVERIFY(screen->press("w"));
    QVERIFY(QTest::qWaitFor([&] { return allAre(RegionColour::White); }, limit));
    QCOMPARE(regions->colour("fuel-gauge"), RegionColour::Other);
}

void ScreenTest::regionsHaveNoColourOnceTheProgramIsGone()
{
    QSignalSpy closed(screen.get(), &Screen::closed);
    program->stop();
    QVERIFY(closed.wait(limit));
    QCOMPARE(regions->colour("key.sel"), RegionColour::None);
    QCOMPARE(regions->colour("trigger"), RegionColour::None);
    QVERIFY(screen->picture().isNull());
}

void ScreenTest::pngFileHoldsThePicture()
{
    const QTemporaryDir folder;
    const QString path = folder.filePath("window.png");
    QVERIFY(screen->writePng(path));
    QCOMPARE(QImage(path).convertToFormat(QImage::Format_RGB32), screen->picture());
    QCOMPARE(QImage::fromData(screen->png(), "PNG").convertToFormat(QImage::Format_RGB32), screen->picture());
    QVERIFY(!screen->writePng(folder.filePath("missing/window.png")));
}

void ScreenTest::screenComesBackWithANewProgram()
{
    QSignalSpy opened(screen.get(), &Screen::opened);
    program->stop();
    QTRY_VERIFY_WITH_TIMEOUT(!screen->isConnected(), limit);
    QVERIFY(program->start());
    QTRY_VERIFY_WITH_TIMEOUT(screen->isConnected(), limit);
    QVERIFY(waitForPicture());
    QCOMPARE(opened.count(), 1);
    QVERIFY(screen->press("F5"));
    QVERIFY(waitForKeyEvents({QString("press %1").arg(int(Qt::Key_F5))}));
}

void ScreenTest::signalLineArrivesAgainAndAgainUntilItIsSwitchedOff()
{
    Registry registry;
    const SignalLines lines(registry, *screen);
    const QString press = QString("press %1").arg(int(Qt::Key_F10));
    const QString release = QString("release %1").arg(int(Qt::Key_F10));
    QCOMPARE(registry.set("trigger.period", 20), std::nullopt);
    QVERIFY(QTest::qWaitFor([&] { return program->keyEvents().count(press) >= 5; }, limit));

    QCOMPARE(registry.set("trigger.period", 0), std::nullopt);
    QVERIFY(screen->press("x"));
    const QString end = QString("press %1").arg(int(Qt::Key_X));
    QVERIFY(QTest::qWaitFor([&] { return program->keyEvents().contains(end); }, limit));
    QCOMPARE(registry.set("radioline.period", 20), std::nullopt);
    const QString radio = QString("press %1").arg(int(Qt::Key_F11));
    QVERIFY(QTest::qWaitFor([&] { return program->keyEvents().count(radio) >= 5; }, limit));

    const QStringList events = program->keyEvents();
    QCOMPARE(events.mid(0, 4), (QStringList{press, release, press, release}));
    QCOMPARE(events.lastIndexOf(press), events.indexOf(end) - 2);
}

void ScreenTest::signalLineThatIsSetBeforeTheProgramStandsArrivesThen()
{
    program->stop();
    QTRY_VERIFY_WITH_TIMEOUT(!screen->isConnected(), limit);
    Registry registry;
    QCOMPARE(registry.set("trigger.period", 20), std::nullopt);
    const SignalLines lines(registry, *screen);
    QVERIFY(program->start());
    const QString press = QString("press %1").arg(int(Qt::Key_F10));
    QVERIFY(QTest::qWaitFor([&] { return program->keyEvents().count(press) >= 2; }, limit));
}

void ScreenTest::tableOnATerminalIsRedrawnWhenAColourChanges()
{
    int ends[2];
    QCOMPARE(::pipe2(ends, O_CLOEXEC | O_NONBLOCK), 0);
    QByteArray written;
    const auto read = [&] {
        std::array<char, 4096> buffer{};
        for (ssize_t count = 0; (count = ::read(ends[0], buffer.data(), buffer.size())) > 0;)
            written.append(buffer.data(), count);
    };
    const LiveTable table(*regions, ends[1]);
    read();
    QCOMPARE(written, table.lines());
    for (const auto& name : RegionMap::names())
        QVERIFY2(written.contains(name.toUtf8() + ' '), qPrintable(name));
    QVERIFY(written.contains("key.down            \x1b[30;47mwhite  \x1b[0m"));
    const auto rows = written.count('\n');
    QCOMPARE(rows, (RegionMap::names().size() + 1) / 2);

    written.clear();
    QVERIFY(screen->press("Down"));
    QVERIFY(QTest::qWaitFor(
        [&] {
            read();
            return written.contains("key.down            \x1b[30;42mgreen  \x1b[0m");
        },
        limit));
    QVERIFY(written.startsWith("\x1b[" + QByteArray::number(rows) + "A\r"));
    ::close(ends[0]);
    ::close(ends[1]);
}

/// Stopped, as by Ctrl-S: the table comes when the terminal goes on, and is up to date then.
void ScreenTest::terminalThatTakesNothingHoldsNobodyUp()
{
    Terminal terminal;
    QVERIFY(terminal.isOpen());
    terminal.stop();
    const LiveTable table(*regions, terminal.end(), "heading\n");
    QVERIFY(screen->press("Down"));
    QTRY_COMPARE_WITH_TIMEOUT(regions->colour("key.down"), RegionColour::Green, limit);
    QCOMPARE(terminal.shown(), QByteArray());
    terminal.goOn();
    QTRY_VERIFY_WITH_TIMEOUT(terminal.shown().contains("key.down            \x1b[30;42mgreen  \x1b[0m"), limit);
    QVERIFY(terminal.shown().startsWith("heading\r\n"));
    QCOMPARE(::fcntl(terminal.end(), F_GETFL) & O_NONBLOCK, 0);
}

void ScreenTest::terminalThatGoesAwayHoldsNobodyUp()
{
    auto terminal = std::make_unique<Terminal>();
    const LiveTable table(*regions, terminal->end());
    terminal.reset();
    QVERIFY(screen->press("Down"));
    QTRY_COMPARE_WITH_TIMEOUT(regions->colour("key.down"), RegionColour::Green, limit);
}

void ScreenTest::frozenProgramHoldsNobodyUp()
{
    program->freeze();
    QVERIFY(screen->press("F5"));
    QVERIFY(screen->release("F5"));
    QVERIFY(!screen->picture().isNull());
    program->thaw();
    QVERIFY(waitForKeyEvents({QString("press %1").arg(int(Qt::Key_F5)), QString("release %1").arg(int(Qt::Key_F5))}));
}

void ScreenTest::screenEndsWhileTheProgramIsFrozenInTheHandshake()
{
    program->freeze();
    auto second = std::make_unique<Screen>();
    QSignalSpy opened(second.get(), &Screen::opened);
    second->open(program->socketPath());
    QVERIFY(!opened.wait(200));
    second.reset();
    program->thaw();
}

QTEST_MAIN(ScreenTest)
#include "ScreenTest.moc"
