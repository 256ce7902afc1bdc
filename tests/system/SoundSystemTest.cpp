// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"
#include "tests/support/ScreenHealth.h"

#include <QFile>
#include <QTest>

using TestSupport::DeviceUnderTest;
using TestSupport::ScreenHealth;

namespace
{

/// A sound starts again within a second of its end, which shows at most one buffer (256 ms) late. On a loaded machine
/// the look that starts it may miss a buffer more; the soak knows no such allowance.
constexpr qint64 longestGap = 1256 + 256;

} // namespace

/// The test sound as the loudspeaker hears it. It has no place on the screen.
class SoundSystemTest : public QObject
{
    Q_OBJECT

private slots:
    void initTestCase();
    void init();

    void volumeIsTheUsualOneFromTheStart();
    void soundPlaysOnWithoutALongGap();
    void brokenSoundFallsSilentAndComesBackAndChangesNothingOnTheScreen_data();
    void brokenSoundFallsSilentAndComesBackAndChangesNothingOnTheScreen();

private:
    [[nodiscard]] QString soundFile() const { return device.stateFile("etc/sounds/TestSound.wav"); }
    [[nodiscard]] bool playsAgain(int times);

    DeviceUnderTest device;
    QByteArray sound;
};

bool SoundSystemTest::playsAgain(int times)
{
    const qint64 before = device.get("audio.sounds").toInteger();
    return QTest::qWaitFor([&] { return device.get("audio.sounds").toInteger() >= before + times; }, 30000);
}

void SoundSystemTest::initTestCase()
{
    REQUIRE(device.start());
    QFile file(soundFile());
    QVERIFY(file.open(QIODevice::ReadOnly));
    sound = file.readAll();
}

void SoundSystemTest::init()
{
    REQUIRE(ScreenHealth::isReached(device));
    REQUIRE(device.waitControl("audio.playing", true));
}

void SoundSystemTest::volumeIsTheUsualOneFromTheStart()
{
    QCOMPARE(device.get("audio.volume_left").toInteger(), 30);
    QCOMPARE(device.get("audio.volume_right").toInteger(), 30);
    QCOMPARE(device.get("audio.volume_writes").toInteger(), 1);
}

void SoundSystemTest::soundPlaysOnWithoutALongGap()
{
    // The start loads the machine more than what comes after it.
    REQUIRE(device.set("audio.forget", true));
    REQUIRE(playsAgain(3));
    QVERIFY2(device.get("audio.gap_ms").toInteger() <= longestGap,
             qPrintable(QString::number(device.get("audio.gap_ms").toInteger())));
    QVERIFY(device.get("audio.gap_ms").toInteger() > 0);
    QCOMPARE(device.get("audio.mismatches").toInteger(), 0);
}

void SoundSystemTest::brokenSoundFallsSilentAndComesBackAndChangesNothingOnTheScreen_data()
{
    QTest::addColumn<QByteArray>("content");
    QTest::addRow("no WAV") << QByteArray("this is no sound");
    QTest::addRow("empty") << QByteArray();
    QTest::addRow("header alone") << QByteArray("RIFF");
}

void SoundSystemTest::brokenSoundFallsSilentAndComesBackAndChangesNothingOnTheScreen()
{
    QFETCH(const QByteArray, content);
    const auto replace = [this](const QByteArray& bytes) {
        QFile file(soundFile());
        return file.open(QIODevice::WriteOnly | QIODevice::Truncate) && file.write(bytes) == bytes.size();
    };
    REQUIRE(device.follow());
    const qint64 mark = device.logMark();
    QVERIFY(replace(content));
    REQUIRE(device.waitLog("Domain/src/DomainLayer/Audio.cpp, 285, Unable to open sound file /etc/sounds/TestSound.wav",
                           DeviceUnderTest::usual, mark));
    REQUIRE(device.waitControl("audio.playing", false));
    REQUIRE(ScreenHealth::passesARound(device));
    QVERIFY(!device.get("audio.playing").toBool());
    QCOMPARE(device.regionsThatTurned("red"), QStringList());
    QCOMPARE(ScreenHealth::differences(device), QString());
    QVERIFY(replace(sound));
    REQUIRE(device.waitControl("audio.playing", true));
    QVERIFY(playsAgain(1));
}

QTEST_GUILESS_MAIN(SoundSystemTest)
#include "SoundSystemTest.moc"
