// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/XmlConfigurationData.h"
#include "Domain/src/DomainLayer/Audio.h"
#include "tests/Domain/SoundFixture.h"
#include "tests/support/LoggedTexts.h"

#include <QTest>

#include <alsa/asoundlib.h>
#include <dlfcn.h>

#include <climits>

using DataSource::AbstractConfigurationData;
using DataSource::XmlConfigurationData;
using Domain::Audio;
using TestSupport::LogCapture;
using TestSupport::loggedTexts;
using TestSupport::SoundFixture;

namespace
{

int callsWithoutHandle = 0;
int loads = 0;
int closes = 0;
int writes = 0;
bool loadFails = false;
bool hasNoControls = false;

QString tooLow(int volume)
{
    return QStringLiteral("Domain/src/DomainLayer/Audio.cpp, 109, Volume less than min of 0. Got %1").arg(volume);
}

QString tooHigh(int volume)
{
    return QStringLiteral("Domain/src/DomainLayer/Audio.cpp, 116, Volume greater than max of 6. Got %1").arg(volume);
}

} // namespace

/// On its way to the library: a call on a handle that was never opened would end the process there.
extern "C" int snd_hctl_load(snd_hctl_t* control)
{
    static const auto real = reinterpret_cast<int (*)(snd_hctl_t*)>(::dlsym(RTLD_NEXT, "snd_hctl_load"));
    ++loads;
    if (control == nullptr)
        ++callsWithoutHandle;
    return control == nullptr || loadFails ? -EINVAL : real(control);
}

extern "C" snd_hctl_elem_t* snd_hctl_last_elem(snd_hctl_t* control)
{
    using Function = snd_hctl_elem_t* (*)(snd_hctl_t*);
    static const auto real = reinterpret_cast<Function>(::dlsym(RTLD_NEXT, "snd_hctl_last_elem"));
    return hasNoControls ? nullptr : real(control);
}

extern "C" int snd_hctl_elem_write(snd_hctl_elem_t* control, snd_ctl_elem_value_t* value)
{
    using Function = int (*)(snd_hctl_elem_t*, snd_ctl_elem_value_t*);
    static const auto real = reinterpret_cast<Function>(::dlsym(RTLD_NEXT, "snd_hctl_elem_write"));
    ++writes;
    return real(control, value);
}

extern "C" int snd_hctl_close(snd_hctl_t* control)
{
    static const auto real = reinterpret_cast<int (*)(snd_hctl_t*)>(::dlsym(RTLD_NEXT, "snd_hctl_close"));
    ++closes;
    return real(control);
}

/// What is written is what the sound card's state file says.
class AudioVolumeTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();

    void freshConfigurationPlaysAtThreeAndStoresIt();
    void storedVolumeIsAppliedAtStartAndNotStoredAgain();
    void unusableStoredVolumes_data();
    void unusableStoredVolumes();
    void everyVolumeHasItsLevel_data();
    void everyVolumeHasItsLevel();
    void outOfRangeVolumeIsStoredAsPassed();
    void outOfRangeVolumeIsLoggedAgainAtTheNextStart();
    void storedVolumeIsWrittenToTheMixerOnly();
    void volumeReadFromTheFileCountsAsEqual();
    void volumeThatIsNoNumberIsReplaced();
    void volumeStoresTheDefaultWhenThereIsNone();
    void withoutACardNothingMoreIsCalled();
    void cardThatRefusesToOpenIsLeftAlone();
    void everyUseOfTheCardEndsWithItsClose();
    void cardThatDoesNotLoadIsClosedAndNotWritten();
    void cardWithoutControlsIsClosedAndNotWritten();

private:
    [[nodiscard]] QByteArray configurationFile() const;
    void restart();

    std::unique_ptr<SoundFixture> sound;
    std::unique_ptr<LogCapture> log;
    std::unique_ptr<XmlConfigurationData> configuration;
    std::unique_ptr<Audio> audio;
};

void AudioVolumeTest::init()
{
    // The library keeps the configuration that it has read; every case has its own.
    snd_config_update_free_global();
    closes = 0;
    writes = 0;
    loadFails = false;
    hasNoControls = false;
    sound = std::make_unique<SoundFixture>();
    log = std::make_unique<LogCapture>();
    configuration = std::make_unique<XmlConfigurationData>(sound->path("configuration"));
    audio = std::make_unique<Audio>(*configuration);
    loggedTexts(*log);
}

void AudioVolumeTest::cleanup()
{
    audio.reset();
    configuration.reset();
    log.reset();
    sound.reset();
}

QByteArray AudioVolumeTest::configurationFile() const
{
    QFile file(sound->path("configuration"));
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray("(none)");
}

void AudioVolumeTest::restart()
{
    audio.reset();
    sound->forgetMixer();
    configuration = std::make_unique<XmlConfigurationData>(sound->path("configuration"));
    audio = std::make_unique<Audio>(*configuration);
}

void AudioVolumeTest::freshConfigurationPlaysAtThreeAndStoresIt()
{
    QCOMPARE(sound->mixer(), "30 30 1");
    QVERIFY(configurationFile().contains("<Volume>3</Volume>"));
    QCOMPARE(audio->volume(), 3);
}

void AudioVolumeTest::storedVolumeIsAppliedAtStartAndNotStoredAgain()
{
    configuration->setData(AbstractConfigurationData::Volume, 5);
    audio.reset();
    sound->forgetMixer();
    const QByteArray marked = configurationFile() + "<!-- untouched -->";
    sound->makeFile("configuration", marked);
    configuration = std::make_unique<XmlConfigurationData>(sound->path("configuration"));
    audio = std::make_unique<Audio>(*configuration);
    QCOMPARE(sound->mixer(), "50 50 1");
    QCOMPARE(configurationFile(), marked);
}

void AudioVolumeTest::unusableStoredVolumes_data()
{
    QTest::addColumn<QString>("stored");
    QTest::addColumn<QString>("mixer");
    QTest::addColumn<QStringList>("logged");
    QTest::addRow("empty") << ""
                           << "0 0 1" << QStringList();
    QTest::addRow("no number") << "loud"
                               << "0 0 1" << QStringList();
    QTest::addRow("fraction") << "4.5"
                              << "0 0 1" << QStringList();
    QTest::addRow("beyond 32 bits") << "99999999999"
                                    << "60 60 1" << QStringList{tooHigh(1215752191)};
    QTest::addRow("blanks") << " 2 "
                            << "20 20 1" << QStringList();
    QTest::addRow("too low") << "-9"
                             << "0 0 1" << QStringList{tooLow(-9)};
    QTest::addRow("too high") << "900"
                              << "60 60 1" << QStringList{tooHigh(900)};
}

void AudioVolumeTest::unusableStoredVolumes()
{
    QFETCH(const QString, stored);
    configuration->setData(AbstractConfigurationData::Volume, stored);
    restart();
    QTEST(sound->mixer(), "mixer");
    QTEST(loggedTexts(*log), "logged");
}

void AudioVolumeTest::everyVolumeHasItsLevel_data()
{
    QTest::addColumn<int>("volume");
    QTest::addColumn<QString>("mixer");
    QTest::addColumn<QStringList>("logged");
    for (int volume = 0; volume <= 6; ++volume)
        QTest::addRow("%d", volume) << volume << QStringLiteral("%1 %1 2").arg(volume * 10) << QStringList();
    for (const int volume : {-1, -2, INT_MIN})
        QTest::addRow("%d", volume) << volume << "0 0 2" << QStringList{tooLow(volume)};
    for (const int volume : {7, 8, INT_MAX})
        QTest::addRow("%d", volume) << volume << "60 60 2" << QStringList{tooHigh(volume)};
}

void AudioVolumeTest::everyVolumeHasItsLevel()
{
    QFETCH(const int, volume);
    audio->setVolume(volume);
    QTEST(sound->mixer(), "mixer");
    QTEST(loggedTexts(*log), "logged");
    QCOMPARE(audio->volume(), volume);
}

void AudioVolumeTest::outOfRangeVolumeIsStoredAsPassed()
{
    audio->setVolume(-2);
    QVERIFY(configurationFile().contains("<Volume>-2</Volume>"));
    audio->setVolume(7);
    QVERIFY(configurationFile().contains("<Volume>7</Volume>"));
}

void AudioVolumeTest::outOfRangeVolumeIsLoggedAgainAtTheNextStart()
{
    audio->setVolume(7);
    loggedTexts(*log);
    restart();
    QCOMPARE(loggedTexts(*log), QStringList{tooHigh(7)});
    QCOMPARE(sound->mixer(), "60 60 1");
}

void AudioVolumeTest::storedVolumeIsWrittenToTheMixerOnly()
{
    audio->setVolume(4);
    sound->makeFile("configuration", "untouched");
    audio->setVolume(4);
    QCOMPARE(sound->mixer(), "40 40 3");
    QCOMPARE(configurationFile(), QByteArray("untouched"));
}

void AudioVolumeTest::volumeReadFromTheFileCountsAsEqual()
{
    restart();
    QCOMPARE(configuration->data(AbstractConfigurationData::Volume), QVariant(QString("3")));
    sound->makeFile("configuration", "untouched");
    audio->setVolume(3);
    QCOMPARE(configurationFile(), QByteArray("untouched"));
    audio->setVolume(2);
    QVERIFY(configurationFile().contains("<Volume>2</Volume>"));
}

void AudioVolumeTest::volumeThatIsNoNumberIsReplaced()
{
    configuration->setData(AbstractConfigurationData::Volume, QString());
    audio->setVolume(0);
    QVERIFY(configurationFile().contains("<Volume>0</Volume>"));
}

void AudioVolumeTest::volumeStoresTheDefaultWhenThereIsNone()
{
    XmlConfigurationData fresh(sound->path("fresh"));
    audio.reset();
    audio = std::make_unique<Audio>(fresh);
    QCOMPARE(audio->volume(), 3);
    QCOMPARE(fresh.data(AbstractConfigurationData::Volume), QVariant(3));
    audio.reset();
}

void AudioVolumeTest::withoutACardNothingMoreIsCalled()
{
    audio.reset();
    sound->chooseNoCard();
    snd_config_update_free_global();
    loads = 0;
    audio = std::make_unique<Audio>(*configuration);
    audio->setVolume(6);
    QCOMPARE(loads, 0);
    QCOMPARE(callsWithoutHandle, 0);
    QCOMPARE(audio->volume(), 6);
    QCOMPARE(loggedTexts(*log), QStringList());
}

void AudioVolumeTest::cardThatRefusesToOpenIsLeftAlone()
{
    // The plugin refuses a card without a state file, which is a failed open, too, of a card that is configured.
    audio.reset();
    qputenv("ALSA_CONFIG_PATH",
            QFile::encodeName(sound->makeFile("broken.conf", "ctl_type.immunityrig { lib \"" MIXER_PLUGIN "\" }\n"
                                                             "ctl.default { type immunityrig }\n")));
    snd_config_update_free_global();
    loads = 0;
    audio = std::make_unique<Audio>(*configuration);
    QCOMPARE(loads, 0);
}

void AudioVolumeTest::everyUseOfTheCardEndsWithItsClose()
{
    QCOMPARE(closes, 1);
    audio->setVolume(4);
    audio->setVolume(9);
    QCOMPARE(closes, 3);
    QCOMPARE(writes, 3);
}

void AudioVolumeTest::cardThatDoesNotLoadIsClosedAndNotWritten()
{
    loadFails = true;
    audio->setVolume(4);
    QCOMPARE(closes, 2);
    QCOMPARE(writes, 1);
    QCOMPARE(audio->volume(), 4);
    QCOMPARE(loggedTexts(*log), QStringList());
}

void AudioVolumeTest::cardWithoutControlsIsClosedAndNotWritten()
{
    hasNoControls = true;
    audio->setVolume(4);
    QCOMPARE(closes, 2);
    QCOMPARE(writes, 1);
    QCOMPARE(audio->volume(), 4);
    QCOMPARE(loggedTexts(*log), QStringList());
}

QTEST_GUILESS_MAIN(AudioVolumeTest)
#include "AudioVolumeTest.moc"
