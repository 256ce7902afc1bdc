// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/SoundFixture.h"
#include "virtual-device/audio/MixerState.h"

#include <QTest>

#include <alsa/asoundlib.h>

using TestSupport::SoundFixture;
using VirtualDevice::MixerState;

/// The virtual sound card as a program sees it through the ALSA library.
class MixerPluginTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();

    void theVolumeIsTheLastOfTwoControls();
    void theVolumeGoesFromZeroToSixty();
    void aNewCardStandsAtZero();
    void bothChannelsAreKeptForTheNextProgram();
    void aLevelBeyondTheRangeChangesNothing_data();
    void aLevelBeyondTheRangeChangesNothing();
    void theSwitchCannotBeWritten();
    void aStateFileThatIsGarbageCountsAsNone_data();
    void aStateFileThatIsGarbageCountsAsNone();
    void aStateThatCannotBeKeptIsRefused();

private:
    void openCard();
    void closeCard();
    static int write(snd_hctl_elem_t* control, long left, long right);
    [[nodiscard]] QList<long> volume() const;

    std::unique_ptr<SoundFixture> sound;
    snd_hctl_t* card = nullptr;
};

void MixerPluginTest::init()
{
    snd_config_update_free_global();
    sound = std::make_unique<SoundFixture>();
    openCard();
}

void MixerPluginTest::cleanup()
{
    closeCard();
    sound.reset();
}

void MixerPluginTest::openCard()
{
    QCOMPARE(snd_hctl_open(&card, "default", 0), 0);
    QCOMPARE(snd_hctl_load(card), 0);
}

void MixerPluginTest::closeCard()
{
    if (card != nullptr)
        snd_hctl_close(std::exchange(card, nullptr));
}

int MixerPluginTest::write(snd_hctl_elem_t* control, long left, long right)
{
    snd_ctl_elem_value_t* value = nullptr;
    snd_ctl_elem_value_alloca(&value);
    snd_ctl_elem_value_set_integer(value, 0, left);
    snd_ctl_elem_value_set_integer(value, 1, right);
    return snd_hctl_elem_write(control, value);
}

QList<long> MixerPluginTest::volume() const
{
    snd_ctl_elem_value_t* value = nullptr;
    snd_ctl_elem_value_alloca(&value);
    if (snd_hctl_elem_read(snd_hctl_last_elem(card), value) < 0)
        return {};
    return {snd_ctl_elem_value_get_integer(value, 0), snd_ctl_elem_value_get_integer(value, 1)};
}

void MixerPluginTest::theVolumeIsTheLastOfTwoControls()
{
    QCOMPARE(snd_hctl_get_count(card), 2U);
    QCOMPARE(snd_hctl_elem_get_name(snd_hctl_first_elem(card)), "Master Playback Switch");
    QCOMPARE(snd_hctl_elem_get_name(snd_hctl_last_elem(card)), "PCM Playback Volume");
}

void MixerPluginTest::theVolumeGoesFromZeroToSixty()
{
    snd_ctl_elem_info_t* info = nullptr;
    snd_ctl_elem_info_alloca(&info);
    QCOMPARE(snd_hctl_elem_info(snd_hctl_last_elem(card), info), 0);
    QCOMPARE(snd_ctl_elem_info_get_type(info), SND_CTL_ELEM_TYPE_INTEGER);
    QCOMPARE(snd_ctl_elem_info_get_count(info), 2U);
    QCOMPARE(snd_ctl_elem_info_get_min(info), 0L);
    QCOMPARE(snd_ctl_elem_info_get_max(info), 60L);
}

void MixerPluginTest::aNewCardStandsAtZero()
{
    QCOMPARE(volume(), (QList<long>{0, 0}));
    QCOMPARE(sound->mixer(), QString());
}

void MixerPluginTest::bothChannelsAreKeptForTheNextProgram()
{
    QCOMPARE(write(snd_hctl_last_elem(card), 12, 60), 1);
    QCOMPARE(write(snd_hctl_last_elem(card), 12, 60), 0); // no change, and yet a write
    closeCard();
    QCOMPARE(sound->mixer(), "12 60 2");
    openCard();
    QCOMPARE(volume(), (QList<long>{12, 60}));
}

void MixerPluginTest::aLevelBeyondTheRangeChangesNothing_data()
{
    QTest::addColumn<int>("left");
    QTest::addColumn<int>("right");
    QTest::addRow("left too high") << 61 << 5;
    QTest::addRow("right too high") << 5 << 61;
    QTest::addRow("left too low") << -1 << 5;
    QTest::addRow("right too low") << 5 << -1;
}

void MixerPluginTest::aLevelBeyondTheRangeChangesNothing()
{
    QFETCH(const int, left);
    QFETCH(const int, right);
    QCOMPARE(write(snd_hctl_last_elem(card), 30, 30), 1);
    QCOMPARE(write(snd_hctl_last_elem(card), left, right), -EINVAL);
    QCOMPARE(sound->mixer(), "30 30 1");
}

void MixerPluginTest::theSwitchCannotBeWritten()
{
    QVERIFY(write(snd_hctl_first_elem(card), 0, 0) < 0);
    QCOMPARE(sound->mixer(), QString());
}

void MixerPluginTest::aStateFileThatIsGarbageCountsAsNone_data()
{
    QTest::addColumn<QByteArray>("content");
    QTest::addRow("empty") << QByteArray();
    QTest::addRow("text") << QByteArray("loud\n");
    QTest::addRow("two numbers") << QByteArray("30 30\n");
    QTest::addRow("left beyond the range") << QByteArray("61 30 1\n");
    QTest::addRow("right beyond the range") << QByteArray("30 -1 1\n");
}

void MixerPluginTest::aStateFileThatIsGarbageCountsAsNone()
{
    QFETCH(const QByteArray, content);
    QVERIFY(!MixerState::read(sound->makeFile("mixer", content).toStdString()));
    QCOMPARE(volume(), (QList<long>{0, 0}));
    QCOMPARE(write(snd_hctl_last_elem(card), 20, 20), 1);
    QCOMPARE(sound->mixer(), "20 20 1");
}

void MixerPluginTest::aStateThatCannotBeKeptIsRefused()
{
    QCOMPARE(write(snd_hctl_last_elem(card), 20, 20), 1);
    const QString folder = QFileInfo(sound->path("mixer")).path();
    QVERIFY(QFile::setPermissions(folder, QFile::ReadOwner | QFile::ExeOwner));
    const int result = write(snd_hctl_last_elem(card), 40, 40);
    QVERIFY(QFile::setPermissions(folder, QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner));
    QCOMPARE(result, -EIO);
    QCOMPARE(sound->mixer(), "20 20 1");
}

QTEST_GUILESS_MAIN(MixerPluginTest)
#include "MixerPluginTest.moc"
