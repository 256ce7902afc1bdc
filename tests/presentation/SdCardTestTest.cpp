// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/SdCardTest.h"

#include "tests/presentation/DebugOutput.h"
#include "tests/presentation/LabelForm.h"
#include "tests/presentation/Poll.h"
#include "tests/presentation/WidgetProbe.h"

#include <QLabel>
#include <QTest>

#include <sys/resource.h>
#include <sys/stat.h>

#include <csignal>

using Presentation::SdCardTest;
using TestSupport::child;
using TestSupport::green;
using TestSupport::Poll;
using TestSupport::readFile;
using TestSupport::red;
using TestSupport::writeFile;

namespace
{

const QString card = QStringLiteral("/sys/block/mmcblk0");
const QString dataFolder = QStringLiteral("/mnt/data");
const QString probeFile = QStringLiteral("/mnt/data/testfile");
const QByteArray probeText("Vantor Tamberly");

QString style(SdCardTest& test)
{
    return child<QLabel>(test, "connectedLabel").styleSheet();
}

/// No byte fits on the card while it lives.
class FullCard
{
public:
    FullCard()
    {
        std::signal(SIGXFSZ, SIG_IGN);
        getrlimit(RLIMIT_FSIZE, &before);
        const rlimit none{0, before.rlim_max};
        setrlimit(RLIMIT_FSIZE, &none);
    }
    ~FullCard() { setrlimit(RLIMIT_FSIZE, &before); }
    FullCard(const FullCard&) = delete;
    FullCard& operator=(const FullCard&) = delete;

private:
    rlimit before{};
};

} // namespace

class SdCardTestTest : public QObject
{
    Q_OBJECT

private slots:
    void init()
    {
        QDir().mkpath(card);
        QDir().mkpath(dataFolder);
    }

    void cleanup()
    {
        ::chmod("/mnt/data", 0755);
        TestSupport::removePath(QStringLiteral("/sys/block"));
        TestSupport::removePath(dataFolder);
    }

    void theFormIsOneLabelThatIsRedAtFirst()
    {
        SdCardTest test(nullptr);
        auto& label = child<QLabel>(test, "connectedLabel");
        TestSupport::compareLabelForm(test, QStringLiteral("SdCardTest"), label, QRect(0, 0, 120, 18),
                                      QStringLiteral("SD Card"), QString());
        QCOMPARE(label.styleSheet(), QStringLiteral("background-color: red"));
        QCOMPARE(TestSupport::paintedColour(label), QColor(255, 0, 0));
    }

    void theTimerOfTheConstructorChecksNothingBeforeStart()
    {
        const TestSupport::TimerProbe probe;
        SdCardTest test(nullptr);
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QCOMPARE(timer->interval(), 1000);
        QVERIFY(timer->isSingleShot());
        QTRY_VERIFY_WITH_TIMEOUT(!timer->isActive(), 20'000);
        QCOMPARE(style(test), QStringLiteral("background-color: red"));
        QVERIFY(!QFile::exists(probeFile));
    }

    void aCardWithoutTheProbeFileGetsItAndIsGreen()
    {
        const TestSupport::DebugOutput output;
        SdCardTest test(nullptr);
        test.start();
        QCOMPARE(style(test), green);
        QCOMPARE(TestSupport::paintedColour(child<QLabel>(test, "connectedLabel")), QColor(0, 128, 0));
        QCOMPARE(readFile(probeFile), probeText);
        QCOMPARE(output.texts(), QStringList());
        QCOMPARE(output.complaints(), QStringList());
    }

    void anExistingProbeFileIsOnlyRead_data()
    {
        QTest::addColumn<QByteArray>("content");
        QTest::addColumn<bool>("isGreen");
        QTest::newRow("of an earlier run") << probeText << true;
        QTest::newRow("that ends in a line break") << probeText + '\n' << false;
        QTest::newRow("with a second line") << probeText + "\nmore" << false;
        QTest::newRow("that is longer") << probeText + '.' << false;
        QTest::newRow("that is shorter") << probeText.chopped(1) << false;
        QTest::newRow("that is empty") << QByteArray() << false;
        QTest::newRow("of noise") << QByteArray("\xff\0%n\x80", 5) << false;
        QTest::newRow("after a byte order mark") << "\xef\xbb\xbf" + probeText << true;
        QTest::newRow("that is longer after a byte order mark") << "\xef\xbb\xbf" + probeText + '.' << false;
        QTest::newRow("with a megabyte behind it") << probeText + QByteArray(1 << 20, '\0') << false;
        QTest::newRow("of a megabyte") << QByteArray(1 << 20, 'V') << false;
    }

    void anExistingProbeFileIsOnlyRead()
    {
        QFETCH(QByteArray, content);
        QFETCH(bool, isGreen);
        writeFile(probeFile, content);
        ::chmod("/mnt/data/testfile", 0444);
        SdCardTest test(nullptr);
        test.start();
        QCOMPARE(style(test), isGreen ? green : red);
        QCOMPARE(readFile(probeFile), content);
    }

    void noMoreIsReadOfALineThanDecides()
    {
        TestSupport::writeEndlessLine(probeFile, probeText);
        SdCardTest test(nullptr);
        const qint64 before = TestSupport::bytesRead();
        test.start();
        QVERIFY(TestSupport::bytesRead() - before < TestSupport::mostReadOfAWord);
        QCOMPARE(style(test), red);
    }

    void aReadOnlyPartitionWithoutTheProbeFileStaysRed()
    {
        QCOMPARE(::chmod("/mnt/data", 0555), 0);
        const TestSupport::DebugOutput output;
        const TestSupport::TimerProbe probe;
        SdCardTest test(nullptr);
        test.start();
        QCOMPARE(style(test), red);
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QTRY_VERIFY_WITH_TIMEOUT(probe.firings(timer) >= 2 && timer->isActive(), 20'000);
        QCOMPARE(style(test), red);
        QVERIFY(!QFile::exists(probeFile));
        QCOMPARE(output.texts(), QStringList());
        QCOMPARE(output.complaints(), QStringList());
    }

    void aReadOnlyPartitionWithTheProbeFileIsGreen()
    {
        writeFile(probeFile, probeText);
        QCOMPARE(::chmod("/mnt/data", 0555), 0);
        SdCardTest test(nullptr);
        test.start();
        QCOMPARE(style(test), green);
    }

    void aFullCardIsRedAndItsEmptyProbeFileStaysAsItIs()
    {
        SdCardTest test(nullptr);
        {
            const FullCard full;
            test.start();
            QCOMPARE(style(test), red);
        }
        test.start();
        QCOMPARE(style(test), red);
        QCOMPARE(readFile(probeFile), QByteArray());
    }

    void anUnreadableProbeFileIsRed()
    {
        writeFile(probeFile, probeText);
        QCOMPARE(::chmod("/mnt/data/testfile", 0), 0);
        const TestSupport::DebugOutput output;
        SdCardTest test(nullptr);
        test.start();
        QCOMPARE(style(test), red);
        QCOMPARE(output.complaints(), QStringList());
    }

    void withoutACardTheProbeFileIsNotTouched()
    {
        TestSupport::removePath(card);
        SdCardTest test(nullptr);
        test.start();
        QCOMPARE(style(test), red);
        QVERIFY(!QFile::exists(probeFile));
    }

    void aCardThatIsALinkToNothingIsNoCard()
    {
        TestSupport::removePath(card);
        QVERIFY(QFile::link(QStringLiteral("../devices/gone"), card));
        SdCardTest test(nullptr);
        test.start();
        QCOMPARE(style(test), red);
        QVERIFY(!QFile::exists(probeFile));
    }

    void aProbeFileThatIsALinkToNothingIsWritten()
    {
        const QString target = dataFolder + QStringLiteral("/target");
        QVERIFY(QFile::link(target, probeFile));
        SdCardTest test(nullptr);
        test.start();
        QCOMPARE(style(test), green);
        QCOMPARE(readFile(target), probeText);
    }

    void followsTheCardInBothDirections()
    {
        const Poll poll("checkConnected");
        SdCardTest test(nullptr);
        test.start();
        QCOMPARE(style(test), green);
        TestSupport::removePath(card);
        QTRY_COMPARE_WITH_TIMEOUT(style(test), red, 20'000);
        QCOMPARE(readFile(probeFile), probeText);
        QDir().mkpath(card);
        QTRY_COMPARE_WITH_TIMEOUT(style(test), green, 20'000);
        poll.compareTimer();
    }

    void aProbeFileThatVanishesIsWrittenAgain()
    {
        SdCardTest test(nullptr);
        test.start();
        QVERIFY(QFile::remove(probeFile));
        QTRY_COMPARE_WITH_TIMEOUT(readFile(probeFile), probeText, 20'000);
        QCOMPARE(style(test), green);
    }

    void stopsAndStartsAgain()
    {
        const Poll poll("checkConnected");
        SdCardTest test(nullptr);
        poll.compareStopAndStart(
            test, [] { TestSupport::removePath(card); }, [&] { return style(test); });
        QCOMPARE(style(test), red);
    }
};

QTEST_MAIN(SdCardTestTest)
#include "SdCardTestTest.moc"
