// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/AbstractConfigurationData.h"
#include "Domain/src/DomainLayer/Audio.h"
#include "tests/support/LogCapture.h"
#include "virtual-device/audio/AudioWatcher.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/sandbox/SandboxPlan.h"
#include "virtual-device/sandbox/StateFolder.h"

#include <QDir>
#include <QFile>
#include <QTest>

using namespace VirtualDevice;

namespace
{

const QString soundPath = QStringLiteral("/etc/sounds/TestSound.wav");

/// Settings that are kept nowhere.
class Settings : public DataSource::AbstractConfigurationData
{
public:
    void setData(ConfigurationData key, const QVariant& value) override { values[key] = value; }
    QVariant data(ConfigurationData key) const override { return values.value(key); }
    QVariant data(ConfigurationData key, const QVariant& defaultValue) override
    {
        if (!values.contains(key))
            values[key] = defaultValue;
        return values[key];
    }

private:
    QMap<int, QVariant> values;
};

} // namespace

/// The program's sound and volume through the real libraries, heard by the virtual device.
class AudioCrossCheckTest : public QObject
{
    Q_OBJECT

    TestSupport::LogCapture log;
    Registry registry;
    std::unique_ptr<AudioWatcher> watcher;
    Settings settings;
    std::unique_ptr<Domain::Audio> audio;
    QFile sound{soundPath};

    [[nodiscard]] qint64 number(const char* name) const { return registry.integer(QString::fromLatin1(name)); }
    [[nodiscard]] bool flag(const char* name) const { return registry.flag(QString::fromLatin1(name)); }

private slots:
    void initTestCase()
    {
        QVERIFY(QDir().mkpath(QFileInfo(soundPath).path()));
        QFile file(soundPath);
        QVERIFY(file.open(QIODevice::WriteOnly));
        QCOMPARE(file.write(testSound()), testSound().size());
        file.close();
        QVERIFY(sound.open(QIODevice::ReadOnly));

        // This test's file system is laid out as the sandbox is: what the plan would bind is put there.
        watcher = std::make_unique<AudioWatcher>(registry);
        QVERIFY(!watcher->open(QLatin1String(AudioWatcher::visibleFolder), soundPath));
        QVERIFY(QDir().mkpath(QFileInfo(QLatin1String(AudioWatcher::visiblePlugin)).path()));
        QVERIFY(QFile::link(QStringLiteral(MIXER_PLUGIN), QLatin1String(AudioWatcher::visiblePlugin)));
        SandboxPlan plan;
        watcher->contribute(plan, QStringLiteral(MIXER_PLUGIN));
        for (auto variable = plan.environment.cbegin(); variable != plan.environment.cend(); ++variable)
            qputenv(qPrintable(variable.key()), variable.value().toLocal8Bit());
        audio = std::make_unique<Domain::Audio>(settings);
    }

    void cleanupTestCase()
    {
        audio.reset();
        QTRY_VERIFY(!flag("audio.playing"));
        watcher.reset();
    }

    void theVolumeReachesTheMixer()
    {
        QTRY_COMPARE(number("audio.volume_left"), 30);
        QCOMPARE(number("audio.volume_right"), 30);
        audio->setVolume(6);
        QTRY_COMPARE(number("audio.volume_left"), 60);
        audio->setVolume(-2);
        QTRY_COMPARE(number("audio.volume_right"), 0);
        QCOMPARE(number("audio.volume_writes"), 3);
    }

    void theSoundIsHeardByteForByteAndEnds()
    {
        audio->play(&sound);
        QTRY_COMPARE_WITH_TIMEOUT(number("audio.sounds"), 1, 20000);
        QTRY_VERIFY(!flag("audio.playing"));
        QTRY_VERIFY(!audio->isPlaying());
        QCOMPARE(number("audio.sounds"), 1);
        QCOMPARE(number("audio.mismatches"), 0);
    }

    void aSecondSoundBeginsAnewAndIsHeardAgain()
    {
        QVERIFY(!registry.set(QStringLiteral("audio.forget"), true));
        audio->play(&sound);
        QTRY_COMPARE(number("audio.sounds"), 2);
        audio->play(&sound); // cuts the one that plays
        QTRY_COMPARE(number("audio.sounds"), 3);
        QTRY_VERIFY(!flag("audio.playing"));
        QCOMPARE(number("audio.mismatches"), 0);
    }

    void aSilenceIsMeasured()
    {
        QTRY_VERIFY(number("audio.gap_ms") > 600);
        audio->play(&sound);
        QTRY_COMPARE(number("audio.sounds"), 4);
        QVERIFY(number("audio.gap_ms") > 600);
    }
};

QTEST_GUILESS_MAIN(AudioCrossCheckTest)
#include "AudioCrossCheckTest.moc"
