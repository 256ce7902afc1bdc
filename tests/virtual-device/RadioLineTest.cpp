// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/RadioFixture.h"

#include <QDeadlineTimer>
#include <QElapsedTimer>

#include <sys/ioctl.h>

#include <algorithm>
#include <limits>

using namespace RadioTest;

/// The line to the microcontroller: its speed, its faults, and the monitor that listens on it.
class RadioLineTest : public Fixture
{
    Q_OBJECT

private slots:
    void init() { setUp(); }
    void cleanup() { tearDown(); }

    void theLineCarriesNoMoreThanItsRate()
    {
        set("radio.to_program.burst", 11'520);
        QElapsedTimer clock;
        clock.start();
        QTRY_COMPARE(tty->everything().size(), 11'520);
        QVERIFY2(clock.elapsed() >= 990, qPrintable(QString::number(clock.elapsed())));
        // The other way: 576 frames of 20 bytes take a second as well, however fast they are written.
        clock.restart();
        const QByteArray frame = radioFrame(bytes("02 000001 02 00 010203040506"));
        QCOMPARE(frame.size(), 20);
        set("radio.ack", "off");
        for (int count = 0; count < 576; ++count)
            QVERIFY(tty->write(frame));
        QTRY_COMPARE(number("radio.frames_good"), 576);
        QVERIFY2(clock.elapsed() >= 990, qPrintable(QString::number(clock.elapsed())));
    }

    /// The quickest of many: a busy machine may hold up any one of them.
    void aByteIsNotHeldForLongerThanItTakes()
    {
        LineDirection direction(*registry, QStringLiteral("radio.to_program"), 0);
        qint64 quickest = std::numeric_limits<qint64>::max();
        for (int round = 0; round < 200; ++round) {
            const QSignalSpy spy(&direction, &LineDirection::delivered);
            QElapsedTimer clock;
            clock.start();
            direction.send("x");
            for (const QDeadlineTimer patience(5000); spy.isEmpty() && !patience.hasExpired();)
                QCoreApplication::processEvents(QEventLoop::WaitForMoreEvents);
            quickest = std::min(quickest, clock.nsecsElapsed());
        }
        QVERIFY2(quickest >= 1'000'000'000 / 11'520 && quickest < 1'000'000, qPrintable(QString::number(quickest)));
    }

    void theProgramNeverWaitsForTheLine()
    {
        set("radio.ack", "off");
        set("radio.line", "unplugged");
        for (int count = 0; count < 100; ++count)
            QVERIFY(tty->write(QByteArray(4000, '\x00')));
        set("radio.line", "connected");
        set("radio.ack", "on");
        command("7e");
        QTRY_VERIFY(tty->messages().contains("7f"));
    }

    void aProgramThatDoesNotReadLosesBytesAndNothingElse()
    {
        set("radio.to_program.burst", 20'000);
        QTRY_VERIFY_WITH_TIMEOUT(number("radio.bytes_lost") > 0, 20'000);
        tty->forget();
        settle();
        tty->forget();
        command("7e");
        QTRY_COMPARE(tty->messages(), (Messages{"fe", "7f"}));
    }

    void damageToTheProgramIsRepeatable_data()
    {
        QTest::addColumn<QString>("fault");
        for (const char* fault : {"drop", "insert", "flip", "duplicate"})
            QTest::newRow(fault) << QString::fromLatin1(fault);
    }

    void damageToTheProgramIsRepeatable()
    {
        QFETCH(QString, fault);
        const QByteArray first = heardThrough(fault, 9);
        QVERIFY(first != QByteArray(500, 'A'));
        QVERIFY(heardThrough(fault, 10) != first);
        QCOMPARE(heardThrough(fault, 9), first);
    }

    void damageToTheRadioIsRepeatable_data() { damageToTheProgramIsRepeatable_data(); }

    void damageToTheRadioIsRepeatable()
    {
        QFETCH(QString, fault);
        const QStringList first = arrivedThrough(fault, 9);
        QCOMPARE(first.size(), 20);
        QVERIFY(first.back() != "1013"); // not all of them came
        QVERIFY(arrivedThrough(fault, 10) != first);
        QCOMPARE(arrivedThrough(fault, 9), first);
    }

    void eachFaultDoesWhatItsNameSays_data()
    {
        QTest::addColumn<QString>("prefix");
        QTest::addColumn<QString>("fault");
        QTest::addColumn<int>("longer");
        QTest::addColumn<bool>("foreign");
        for (const char* prefix : {"radio.to_program", "radio.to_radio"}) {
            const auto row = [prefix](const char* fault, int longer, bool foreign) {
                QTest::addRow("%s.%s", prefix, fault)
                    << QString::fromLatin1(prefix) << QString::fromLatin1(fault) << longer << foreign;
            };
            row("drop", -1, false);
            row("insert", 1, true);
            row("flip", 0, true);
            row("duplicate", 1, false);
        }
    }

    void eachFaultDoesWhatItsNameSays()
    {
        QFETCH(QString, prefix);
        QFETCH(QString, fault);
        QFETCH(int, longer);
        QFETCH(bool, foreign);
        const QByteArray sent(500, 'A');
        (void)registry->set(prefix + '.' + fault, 20'000);
        LineDirection direction(*registry, prefix, 0);
        const QSignalSpy spy(&direction, &LineDirection::delivered);
        direction.send(sent);
        (void)registry->set(prefix + '.' + fault, 0);
        direction.send("end");
        QByteArray heard;
        QTRY_VERIFY((heard = joined(spy), heard.endsWith("end")));
        heard.chop(3);
        QCOMPARE((heard.size() > sent.size()) - (heard.size() < sent.size()), longer);
        QCOMPARE(heard.count('A') < heard.size(), foreign);
    }

    void damageToTheRadioIsCountedAndNoViolationOfTheProgram()
    {
        set("radio.to_radio.flip", 100'000);
        command("6401");
        QTRY_COMPARE(number("radio.frames_bad"), 1);
        set("radio.to_radio.flip", 0);
        QCOMPARE(number("radio.frames_good"), 0);
        QCOMPARE(number("radio.violations"), 0);
        QVERIFY(!flag("radio.amplifier"));
    }

    void aBurstToTheRadioIsDamageThatPasses()
    {
        set("radio.to_radio.burst", 200);
        QCOMPARE(number("radio.to_radio.burst"), 0);
        QTRY_VERIFY(number("radio.frames_bad") > 0);
        set("radio.ack", "on");
        QTRY_VERIFY((command("6401"), QTest::qWaitFor([this] { return flag("radio.amplifier"); }, 200)));
    }

    void aRepeatedBurstComesAgainAndAgain()
    {
        set("radio.to_program.burst_every", 20);
        set("radio.to_program.burst", 10);
        QTRY_VERIFY(tty->everything().size() >= 50);
        set("radio.to_program.burst_every", 0);
        QCOMPARE(number("radio.to_program.burst"), 0);
    }

    void splitDeliveriesComeInSmallPiecesAndWhole_data()
    {
        QTest::addColumn<QString>("prefix");
        for (const char* prefix : {"radio.to_program", "radio.to_radio"})
            QTest::addRow("%s", prefix) << QString::fromLatin1(prefix);
    }

    void splitDeliveriesComeInSmallPiecesAndWhole()
    {
        QFETCH(QString, prefix);
        (void)registry->set(prefix + QStringLiteral(".delivery"), QStringLiteral("split"));
        LineDirection direction(*registry, prefix, 0);
        const QSignalSpy spy(&direction, &LineDirection::delivered);
        direction.send("twenty-two bytes long.");
        QByteArray whole;
        QTRY_VERIFY((whole = joined(spy), whole.size() == 22));
        QCOMPARE(whole, QByteArray("twenty-two bytes long."));
        for (const auto& call : spy)
            QVERIFY(call[0].toByteArray().size() <= 3);
        command("70");
        QTRY_COMPARE(tty->messages(), (Messages{"fe", "710105"}));
    }

    void whatDoesNotFitOnTheLineIsLostAndCounted()
    {
        LineDirection direction(*registry, QStringLiteral("radio.to_radio"), 0);
        direction.send(QByteArray(LineDirection::capacity, 'x'));
        QCOMPARE(number("radio.bytes_lost"), 0);
        direction.send("too much");
        QCOMPARE(number("radio.bytes_lost"), 8);
    }

    void mergedBytesComeAtOnce_data() { splitDeliveriesComeInSmallPiecesAndWhole_data(); }

    /// They take half a second, in which the line would give them away a hundred times.
    void mergedBytesComeAtOnce()
    {
        QFETCH(QString, prefix);
        (void)registry->set(prefix + QStringLiteral(".delivery"), QStringLiteral("merge"));
        LineDirection direction(*registry, prefix, 0);
        const QSignalSpy spy(&direction, &LineDirection::delivered);
        direction.send(QByteArray(5000, 'x'));
        QTRY_COMPARE(spy.size(), 1);
        QCOMPARE(joined(spy).size(), 5000);
    }

    void mergedDeliveriesComeTogether()
    {
        set("radio.to_program.delivery", "merge");
        command("7e");
        int available = 0;
        QTRY_VERIFY((::ioctl(tty->fd(), FIONREAD, &available), available > 0));
        QCOMPARE(available, 18); // acknowledgement and reply in one
    }

    void anUnpluggedLineLosesBothWaysAndComesBack()
    {
        set("radio.line", "unplugged");
        command("6401");
        set("radio.text", "lost");
        for (int pass = 0; pass < 20; ++pass) // of the event loop, however long each takes
            QTest::qWait(5);
        QCOMPARE(tty->everything(), QByteArray());
        QCOMPARE(number("radio.frames_good"), 0);
        set("radio.line", "connected");
        acknowledged("6401");
        QCOMPARE(text("radio.device"), radio->devicePath());
    }

    void aHungUpLineEndsForItsReaderAndReturnsForTheNext()
    {
        const QString before = radio->devicePath();
        set("radio.line", "hung-up");
        QCOMPARE(text("radio.device"), QString());
        char byte = 0;
        QCOMPARE(::read(tty->fd(), &byte, 1), 0);
        QCOMPARE(::write(tty->fd(), &byte, 1), -1);
        QCOMPARE(errno, EIO);
        set("radio.line", "connected");
        QVERIFY(!radio->devicePath().isEmpty());
        QCOMPARE(::write(tty->fd(), &byte, 1), -1); // for good
        tty = std::make_unique<TtyClient>(radio->devicePath());
        command("7e");
        QTRY_COMPARE(tty->messages(), (Messages{"fe", "7f"}));
    }

    void theMonitorNamesWhatTheProgramDoesWrong_data()
    {
        QTest::addColumn<QByteArray>("written");
        QTest::addColumn<QString>("violation");
        QTest::newRow("header") << bytes("7c 0001 007e 00fc 7e 0a") << "bad header checksum";
        QTest::newRow("data") << bytes("7c 0001 007e 00fb 7d 0a") << "bad data checksum";
        QTest::newRow("end") << bytes("7c 0001 007e 00fb 7e 0b") << "bad end byte";
        QTest::newRow("stray") << bytes("00 01") << "bytes outside a frame";
        QTest::newRow("length") << radioFrame(QByteArray(101, 'x')) << "length 101 over the limit of 100";
        QTest::newRow("empty") << radioFrame({}) << "empty message";
        QTest::newRow("code") << radioFrame(bytes("99")) << "unknown command 0x99";
        QTest::newRow("shape") << radioFrame(bytes("7e01")) << "command 0x7e with 1 data bytes";
    }

    void theMonitorNamesWhatTheProgramDoesWrong()
    {
        QFETCH(QByteArray, written);
        QFETCH(QString, violation);
        const QSignalSpy spy(radio.get(), &RadioModel::violated);
        QVERIFY(tty->write(written));
        QTRY_COMPARE(number("radio.violations"), 1);
        QCOMPARE(text("radio.last_violation"), violation);
        QCOMPARE(spy.size(), 1);
        QCOMPARE(spy[0][0].toString(), violation);
    }

    void aSecondCommandWhileOneIsUnacknowledgedIsAViolation()
    {
        set("radio.ack", "off");
        command("7e");
        command("61");
        QTRY_COMPARE(text("radio.last_violation"), QStringLiteral("command 0x61 while 0x7e is unacknowledged"));
        QCOMPARE(number("radio.violations"), 1);
    }

    void anAcknowledgementOfTheWrongLengthAllowsNoSecondCommand()
    {
        set("radio.ack", "wrong-length");
        command("6401");
        QTRY_COMPARE(tty->messages(), Messages{"fe00"});
        command("6400");
        QTRY_COMPARE(number("radio.violations"), 1);
    }

    void aCommandAfterAcknowledgementRefusalOrTimeOutIsNone()
    {
        acknowledged("6401");
        set("radio.ack", "nak");
        command("6400");
        QTRY_COMPARE(tty->messages(), Messages{"ff00"});
        set("radio.ack", "off");
        command("7e");
        QTRY_COMPARE(number("radio.commands"), 3);                            // the monitor's patience has begun
        QTest::qWait(static_cast<int>(RadioMonitor::patience.count()) + 100); // then the program may have given up
        command("7e");
        QTRY_COMPARE(number("radio.commands"), 4);
        QCOMPARE(number("radio.violations"), 0);
    }

    void severalRadiosDoNotMeet()
    {
        Registry otherRegistry;
        RadioModel other(otherRegistry);
        QVERIFY(other.devicePath() != radio->devicePath());
        acknowledged("6401");
        QVERIFY(!otherRegistry.flag("radio.amplifier"));
    }
};

QTEST_GUILESS_MAIN(RadioLineTest)
#include "RadioLineTest.moc"
