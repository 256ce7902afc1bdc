// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/RadioFixture.h"

#include <QElapsedTimer>

#include <thread>

using namespace RadioTest;

/// The microcontroller: what it takes, what it answers.
class RadioModelTest : public Fixture
{
    Q_OBJECT

private slots:
    void init() { setUp(); }
    void cleanup() { tearDown(); }

    void theLineIsRawBeforeAnybodyOpensIt()
    {
        termios attributes{};
        QCOMPARE(::tcgetattr(tty->fd(), &attributes), 0);
        QCOMPARE(attributes.c_lflag & (ECHO | ICANON | ISIG), 0U);
        QCOMPARE(attributes.c_oflag & OPOST, 0U);
        QCOMPARE(attributes.c_iflag & (ICRNL | IXON), 0U);
        QCOMPARE(text("radio.device"), radio->devicePath());
    }

    void aPingIsAcknowledgedAndThenAnsweredByteForByte()
    {
        QVERIFY(tty->write(bytes("7c 0001 007e 00fb 7e 0a")));
        QTRY_COMPARE(tty->everything(), bytes("7c 0001 00fe 017b fe 0a  7c 0001 007f 00fc 7f 0a"));
        QCOMPARE(number("radio.pings"), 1);
        QCOMPARE(number("radio.frames_good"), 1);
        QCOMPARE(number("radio.frames_bad"), 0);
        QCOMPARE(number("radio.violations"), 0);
    }

    void theFirmwareVersionIsReported()
    {
        command("70");
        QTRY_COMPARE(tty->everything(), bytes("7c 0001 00fe 017b fe 0a  7c 0003 0077 00f6 710105 0a"));
        tty->forget();
        set("radio.version", "2.10");
        command("70");
        QTRY_COMPARE(tty->messages(), (Messages{"fe", "71020a"}));
    }

    void aVersionThatIsNoneIsPutBack()
    {
        for (const char* nonsense : {"", "1", "1.256", "a.b", "-1.2", "1.2.3"}) {
            set("radio.version", nonsense);
            QCOMPARE(text("radio.version"), QStringLiteral("1.5"));
        }
    }

    void theRadioCheckIsReportedInAndOutOfRange()
    {
        set("radio.check", 2);
        command("62");
        QTRY_COMPARE(tty->everything(), bytes("7c 0001 00fe 017b fe 0a  7c 0002 0065 00e3 6302 0a"));
        tty->forget();
        set("radio.check", 255);
        command("62");
        QTRY_COMPARE(tty->messages(), (Messages{"fe", "63ff"}));
    }

    void theRfTestIsVisible()
    {
        acknowledged("602802");
        QCOMPARE(number("radio.channel"), 40);
        QCOMPARE(number("radio.frequency"), 2440);
        QCOMPARE(number("radio.power_level"), 2);
        QVERIFY(flag("radio.transmitting"));
        acknowledged("61");
        QVERIFY(!flag("radio.transmitting"));
        QCOMPARE(number("radio.frequency"), 2440);
        QCOMPARE(text("radio.last_command"), QStringLiteral("61"));
        QCOMPARE(number("radio.commands"), 2);
    }

    void theAmplifierIsVisible()
    {
        acknowledged("6401");
        QVERIFY(flag("radio.amplifier"));
        acknowledged("6400");
        QVERIFY(!flag("radio.amplifier"));
    }

    void theBeaconIsVisible()
    {
        acknowledged("20 123456 02284a0a f8ff 0801");
        QVERIFY(flag("radio.beacon"));
        QCOMPARE(text("radio.beacon_address"), QStringLiteral("123456"));
        QCOMPARE(text("radio.beacon_channels"), QStringLiteral("2 40 74 10"));
        QCOMPARE(text("radio.beacon_packets"), QStringLiteral("f8ff0801"));
        acknowledged("22 1002");
        QCOMPARE(text("radio.beacon_packets"), QStringLiteral("1002"));
        acknowledged("21 00");
        QVERIFY(!flag("radio.beacon"));
        acknowledged("20 000001 02020202");
        QCOMPARE(text("radio.beacon_packets"), QString());
        QCOMPARE(number("radio.violations"), 0);
    }

    void aPacketIsTransmittedAndReportedComplete()
    {
        command("02 ffffff 4a 01 c0ffee");
        QTRY_COMPARE(tty->messages(), (Messages{"fe", "03"}));
        QCOMPARE(text("radio.packet"), QStringLiteral("ffffff4a01c0ffee"));
        QCOMPARE(number("radio.packets"), 1);
    }

    void theFramePulseLineIsCounted()
    {
        acknowledged("65");
        acknowledged("65");
        QCOMPARE(number("radio.frame_pulses"), 2);
    }

    void accelerometerFramesComeAtTheirRateInTheModeThatWasSet()
    {
        acknowledged("3002");
        set("radio.accel_rate", 100);
        QTRY_VERIFY(tty->messages().size() >= 10);
        set("radio.accel_rate", 0);
        const auto frames = tty->messages();
        QCOMPARE(frames[0], QByteArray("31000002000102030405060708090a0b0c0d0e"));
        QCOMPARE(frames[1], QByteArray("310001020102030405060708090a0b0c0d0e0f"));
        QVERIFY(number("radio.accel_frames") >= 10);
    }

    void aTextIsSentOnceAndTheControlIsEmptyAgain()
    {
        set("radio.text", "Hi");
        QTRY_COMPARE(tty->everything(), bytes("7c 0003 012c 00ac 7b4869 0a"));
        QCOMPARE(text("radio.text"), QString());
        set("radio.text", "Hi");
        QTRY_COMPARE(tty->messages(), (Messages{"7b4869", "7b4869"}));
    }

    void anyMessageAndAnyBytesCanBeSent()
    {
        set("radio.message", "9900ff");
        QTRY_COMPARE(tty->messages(), Messages{"9900ff"});
        tty->forget();
        set("radio.raw", "7c7c007f");
        QTRY_COMPARE(tty->everything(), bytes("7c7c007f"));
        QCOMPARE(text("radio.raw"), QString());
    }

    void withoutAcknowledgementNothingIsCarriedOut()
    {
        set("radio.ack", "off");
        command("6401");
        QTRY_COMPARE(number("radio.commands"), 1);
        settle();
        QCOMPARE(tty->messages(), Messages{QByteArray("7b") + QByteArray("settled").toHex()});
        QVERIFY(!flag("radio.amplifier"));
    }

    void aRefusedCommandIsNotCarriedOut()
    {
        set("radio.ack", "nak");
        set("radio.nak_code", 5);
        command("6401");
        QTRY_COMPARE(tty->everything(), bytes("7c 0002 0104 0083 ff05 0a"));
        QVERIFY(!flag("radio.amplifier"));
    }

    void aLateAcknowledgementComesAfterItsDelayAndBeforeTheReply()
    {
        set("radio.ack", "late");
        set("radio.ack_delay", 300);
        QElapsedTimer clock;
        clock.start();
        command("7e");
        QTRY_COMPARE(tty->messages(), (Messages{"fe", "7f"}));
        QVERIFY2(clock.elapsed() >= 300, qPrintable(QString::number(clock.elapsed())));
    }

    void anAcknowledgementCanBeTooLong()
    {
        set("radio.ack", "wrong-length");
        command("6401");
        QTRY_COMPARE(tty->messages(), Messages{"fe00"});
        QVERIFY(flag("radio.amplifier"));
    }

    void aLostAcknowledgementLeavesTheReply()
    {
        set("radio.ack", "lost");
        command("7e");
        QTRY_COMPARE(tty->messages(), Messages{"7f"});
    }

    void aReplyCanBeMissingOrTooLong()
    {
        set("radio.reply", "wrong-length");
        command("7e");
        QTRY_COMPARE(tty->messages(), (Messages{"fe", "7f00"}));
        tty->forget();
        set("radio.reply", "off");
        acknowledged("7e");
    }

    void whatTheFirmwareDoesNotKnowIsRefused_data()
    {
        QTest::addColumn<QByteArray>("message");
        QTest::addColumn<QByteArray>("answer");
        QTest::newRow("unknown command") << bytes("99") << QByteArray("ff01");
        QTest::newRow("amplifier without a value") << bytes("64") << QByteArray("ff02");
        QTest::newRow("ping with data") << bytes("7e00") << QByteArray("ff02");
        QTest::newRow("channel 1") << bytes("600100") << QByteArray("ff03");
        QTest::newRow("channel 75") << bytes("604b00") << QByteArray("ff03");
        QTest::newRow("power level 4") << bytes("600204") << QByteArray("ff03");
        QTest::newRow("packet on channel 1") << bytes("02000001010000") << QByteArray("ff03");
        QTest::newRow("half a beacon packet") << bytes("2000000102020202f8") << QByteArray("ff03");
        QTest::newRow("half a beacon packet in an update") << bytes("22f8") << QByteArray("ff03");
    }

    void whatTheFirmwareDoesNotKnowIsRefused()
    {
        QFETCH(QByteArray, message);
        QFETCH(QByteArray, answer);
        QVERIFY(tty->write(radioFrame(message)));
        QTRY_COMPARE(tty->messages(), Messages{answer});
        QVERIFY(!flag("radio.transmitting"));
        QVERIFY(!flag("radio.beacon"));
    }

    void aCommandOfAnotherLengthIsRefused_data()
    {
        QTest::addColumn<int>("code");
        QTest::addColumn<QList<int>>("lengths");
        QTest::newRow("transmit packet") << 0x02 << QList<int>{0, 5, 38};
        QTest::newRow("start beacon") << 0x20 << QList<int>{0, 6, 18};
        QTest::newRow("stop beacon") << 0x21 << QList<int>{0, 2};
        QTest::newRow("update beacon") << 0x22 << QList<int>{11, 12};
        QTest::newRow("accelerometer mode") << 0x30 << QList<int>{0, 2};
        QTest::newRow("start RF test") << 0x60 << QList<int>{0, 1, 3};
        QTest::newRow("stop RF test") << 0x61 << QList<int>{1};
        QTest::newRow("check radio") << 0x62 << QList<int>{1};
        QTest::newRow("amplifier") << 0x64 << QList<int>{0, 2};
        QTest::newRow("frame pulse") << 0x65 << QList<int>{1};
        QTest::newRow("version") << 0x70 << QList<int>{1};
        QTest::newRow("ping") << 0x7E << QList<int>{1};
    }

    void aCommandOfAnotherLengthIsRefused()
    {
        QFETCH(int, code);
        QFETCH(QList<int>, lengths);
        for (const int length : lengths) {
            QVERIFY(tty->write(radioFrame(static_cast<char>(code) + QByteArray(length, '\x02'))));
            QTRY_COMPARE(tty->messages(), Messages{"ff02"});
            tty->forget();
        }
        QCOMPARE(number("radio.violations"), lengths.size());
    }

    void nothingIsWrittenBeforeTheResetLineOrTheFirstCommand()
    {
        Registry fresh;
        RadioModel asleep(fresh);
        TtyClient listener(asleep.devicePath());
        QVERIFY(!fresh.set("radio.text", "early"));
        QVERIFY(!fresh.set("radio.accel_rate", 100));
        QVERIFY(!fresh.set("radio.to_program.burst", 100));
        QTest::qWait(200); // an absence can only be given some time
        QCOMPARE(listener.everything(), QByteArray());
        asleep.reset();
        QTRY_VERIFY(listener.messages().contains(QByteArray("7b") + QByteArray("early").toHex()));
    }

    void aCommandWakesARadioWhoseResetLineIsMissing()
    {
        Registry fresh;
        RadioModel asleep(fresh);
        TtyClient program(asleep.devicePath());
        QVERIFY(program.write(radioFrame(bytes("7e"))));
        QTRY_COMPARE(program.messages(), (Messages{"fe", "7f"}));
        QCOMPARE(fresh.integer("radio.resets"), 0);
    }

    void aResetForgetsWhatTheRadioWasTold()
    {
        acknowledged("602803");
        acknowledged("6401");
        acknowledged("20 000001 02020202 f8ff");
        acknowledged("3002");
        command("02 ffffff 4a 01 c0ffee");
        QTRY_COMPARE(tty->messages(), (Messages{"fe", "03"}));
        tty->forget();
        set("radio.ack", "late");
        set("radio.ack_delay", 2000);
        command("7e");
        QTRY_COMPARE(number("radio.pings"), 1);
        radio->reset();
        QTRY_COMPARE(number("radio.resets"), 2);
        tty->forget();
        QVERIFY(!flag("radio.transmitting"));
        QVERIFY(!flag("radio.amplifier"));
        QVERIFY(!flag("radio.beacon"));
        QCOMPARE(number("radio.channel"), 0);
        QCOMPARE(number("radio.frequency"), 0);
        QCOMPARE(number("radio.power_level"), 0);
        QCOMPARE(number("radio.accel_mode"), 0);
        QCOMPARE(text("radio.beacon_address"), QString());
        QCOMPARE(text("radio.beacon_channels"), QString());
        QCOMPARE(text("radio.beacon_packets"), QString());
        QCOMPARE(text("radio.packet"), QString());
        // The answer that was under way would come before one that is delayed as much.
        command("70");
        QTRY_VERIFY(tty->messages().contains("710105"));
        QCOMPARE(tty->messages(), (Messages{"fe", "710105"}));
    }

    void aResetFromAnotherThreadPrecedesWhatThatThreadWritesNext()
    {
        for (int round = 0; round < 50; ++round) {
            std::thread program([this] {
                radio->reset();
                (void)tty->write(radioFrame(bytes("6401")));
            });
            program.join();
            QTRY_COMPARE(tty->messages(), Messages{"fe"});
            QVERIFY(flag("radio.amplifier"));
            tty->forget();
        }
        QTRY_COMPARE(number("radio.resets"), 51);
        QVERIFY(flag("radio.amplifier"));
    }
};

QTEST_GUILESS_MAIN(RadioModelTest)
#include "RadioModelTest.moc"
