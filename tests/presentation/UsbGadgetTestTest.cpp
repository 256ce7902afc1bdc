// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/UsbGadgetTest.h"

#include "tests/presentation/DebugOutput.h"
#include "tests/presentation/LabelForm.h"
#include "tests/presentation/Poll.h"
#include "tests/presentation/WidgetProbe.h"

#include <QLabel>
#include <QTest>

using Presentation::UsbGadgetTest;
using TestSupport::child;
using TestSupport::green;
using TestSupport::Poll;
using TestSupport::red;
using TestSupport::writeFile;

namespace
{

const QString mode = QStringLiteral("/sys/devices/platform/musb_hdrc/mode");
const QString openFailed = QStringLiteral("Cannot open file ");

} // namespace

class UsbGadgetTestTest : public QObject
{
    Q_OBJECT

private slots:
    void init() { writeFile(mode, "b_peripheral\n"); }
    void cleanup() { TestSupport::removePath(QStringLiteral("/sys/devices")); }

    void theFormIsOneLabelThatIsRedAtFirst()
    {
        UsbGadgetTest test(nullptr);
        auto& label = child<QLabel>(test, "connectLabel");
        TestSupport::compareLabelForm(test, QStringLiteral("UsbGadgetTest"), label, QRect(0, 0, 120, 25),
                                      QStringLiteral("HID Gadget"), QStringLiteral("DejaVu Sans"));
        QCOMPARE(label.styleSheet(), red);
    }

    void isIdleUntilStarted()
    {
        UsbGadgetTest test(nullptr);
        QVERIFY(QMetaObject::invokeMethod(&test, "checkConnect"));
        QCOMPARE(child<QLabel>(test, "connectLabel").styleSheet(), red);
    }

    void theModeDecidesTheColour_data()
    {
        QTest::addColumn<QByteArray>("content");
        QTest::addColumn<bool>("isGreen");
        QTest::newRow("peripheral with its line end") << QByteArray("b_peripheral\n") << true;
        QTest::newRow("peripheral without a line end") << QByteArray("b_peripheral") << false;
        QTest::newRow("whatever the last character is, it is dropped") << QByteArray("b_peripheral!") << true;
        QTest::newRow("two characters of line end") << QByteArray("b_peripheral\r\n") << false;
        QTest::newRow("only the first line counts") << QByteArray("b_peripheral\na_host\n") << true;
        QTest::newRow("another first line") << QByteArray("a_host\nb_peripheral\n") << false;
        QTest::newRow("idle") << QByteArray("b_idle\n") << false;
        QTest::newRow("empty") << QByteArray() << false;
        QTest::newRow("an empty line") << QByteArray("\n") << false;
        QTest::newRow("noise") << QByteArray("\0\xff%n\x80\n", 6) << false;
        QTest::newRow("longer by two characters") << QByteArray("b_peripheral!\n") << false;
        QTest::newRow("a megabyte") << QByteArray(1 << 20, 'b') << false;
        QTest::newRow("the mode and a megabyte after it") << "b_peripheral\n" + QByteArray(1 << 20, 'b') << true;
    }

    void theModeDecidesTheColour()
    {
        QFETCH(QByteArray, content);
        QFETCH(bool, isGreen);
        writeFile(mode, content);
        const TestSupport::DebugOutput output;
        UsbGadgetTest test(nullptr);
        test.start();
        QCOMPARE(child<QLabel>(test, "connectLabel").styleSheet(), isGreen ? green : red);
        QCOMPARE(output.texts(), QStringList());
        QCOMPARE(output.complaints(), QStringList());
    }

    void noMoreIsReadOfALineThanDecides()
    {
        TestSupport::writeEndlessLine(mode, "b_peripheral");
        UsbGadgetTest test(nullptr);
        const qint64 before = TestSupport::bytesRead();
        test.start();
        QVERIFY(TestSupport::bytesRead() - before < TestSupport::mostReadOfAWord);
        QCOMPARE(child<QLabel>(test, "connectLabel").styleSheet(), red);
    }

    void theOpenFileIsReadAnewEverySecond()
    {
        const Poll poll("checkConnect");
        UsbGadgetTest test(nullptr);
        auto& label = child<QLabel>(test, "connectLabel");
        test.start();
        QCOMPARE(label.styleSheet(), green);
        QCOMPARE(TestSupport::paintedColour(label), QColor(0, 128, 0));
        for (int round = 0; round < 2; ++round) {
            writeFile(mode, "a_host\n");
            QTRY_COMPARE_WITH_TIMEOUT(label.styleSheet(), red, 20'000);
            writeFile(mode, "b_peripheral\n");
            QTRY_COMPARE_WITH_TIMEOUT(label.styleSheet(), green, 20'000);
        }
        poll.compareTimer();
    }

    void aFileThatWasEmptyIsReadOnceItHoldsSomething()
    {
        writeFile(mode, "");
        UsbGadgetTest test(nullptr);
        test.start();
        writeFile(mode, "b_peripheral\n");
        QTRY_COMPARE_WITH_TIMEOUT(child<QLabel>(test, "connectLabel").styleSheet(), green, 20'000);
    }

    void theFileStaysOpenForTheWholeRun()
    {
        UsbGadgetTest test(nullptr);
        test.start();
        const TestSupport::TimerProbe probe;
        QFile::remove(mode);
        writeFile(mode, "a_host\n");
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QTRY_VERIFY_WITH_TIMEOUT(timer->isActive(), 20'000);
        QCOMPARE(child<QLabel>(test, "connectLabel").styleSheet(), green);
    }

    void aMissingFileIsToldOnceAndStaysRedEvenWhenItComes()
    {
        TestSupport::removePath(mode);
        const TestSupport::DebugOutput output;
        const TestSupport::TimerProbe probe;
        UsbGadgetTest test(nullptr);
        QCOMPARE(output.texts(), QStringList({openFailed}));
        test.start();
        writeFile(mode, "b_peripheral\n");
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QTRY_VERIFY_WITH_TIMEOUT(timer->isActive(), 20'000);
        QCOMPARE(child<QLabel>(test, "connectLabel").styleSheet(), red);
        QCOMPARE(output.texts(), QStringList({openFailed}));
        QCOMPARE(output.complaints(), QStringList());
    }

    void stopsAndStartsAgain()
    {
        const Poll poll("checkConnect");
        UsbGadgetTest test(nullptr);
        const auto& label = child<QLabel>(test, "connectLabel");
        poll.compareStopAndStart(
            test, [] { writeFile(mode, "a_host\n"); }, [&] { return label.styleSheet(); });
        QCOMPARE(label.styleSheet(), red);
    }
};

QTEST_MAIN(UsbGadgetTestTest)
#include "UsbGadgetTestTest.moc"
