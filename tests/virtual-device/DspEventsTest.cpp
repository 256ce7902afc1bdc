// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/DspFixture.h"

#include <QElapsedTimer>

using namespace DspModelTesting;

/// What the DSP says by itself: the operator's messages and the sensors' data.
class DspEventsTest : public Fixture
{
    Q_OBJECT

private slots:
    void init() { setUp(); }
    void cleanup() { tearDown(); }

    void theOperatorMakesTheDspSayThings_data()
    {
        QTest::addColumn<QString>("control");
        QTest::addColumn<QString>("value");
        QTest::addColumn<QByteArray>("data");
        QTest::newRow("log") << "dsp.log"
                             << "Hi" << QByteArray("0210010003000000486900");
        QTest::newRow("noise") << "dsp.line_noise"
                               << "detected" << QByteArray("061001000100000001");
        QTest::newRow("no noise") << "dsp.line_noise"
                                  << "quiet" << QByteArray("061001000100000000");
        QTest::newRow("noise without data") << "dsp.line_noise"
                                            << "empty" << QByteArray("0610010000000000");
        QTest::newRow("start") << "dsp.start_trigger"
                               << "258 -2" << QByteArray("07100100060000000201feffffff");
        QTest::newRow("stop") << "dsp.stop_trigger"
                              << "65535 1000" << QByteArray("0810010006000000ffffe8030000");
        QTest::newRow("pairing") << "dsp.pairing_packet"
                                 << "123456 abcdef 05" << QByteArray("0310010007000000123456abcdef05");
        QTest::newRow("discarded") << "dsp.message"
                                   << "11001" << QByteArray("0110010000000000");
        QTest::newRow("unknown") << "dsp.message"
                                 << "11009 01 02 03" << QByteArray("0910010003000000010203");
        QTest::newRow("raw") << "dsp.raw"
                             << "0b10" << QByteArray("0b10");
    }

    void theOperatorMakesTheDspSayThings()
    {
        QFETCH(QString, control);
        QFETCH(QString, value);
        QFETCH(QByteArray, data);
        const QJsonValue idle = registry->value(control);
        bringUp();
        QVERIFY(!registry->set(control, value));
        QTRY_COMPARE(program->messages(), Packets{data});
        QCOMPARE(registry->value(control), idle);
    }

    void nonsenseIsTakenBackAndNotSent()
    {
        bringUp();
        for (const char* nonsense : {"1", "a b", "70000 1", "1 2 3"}) {
            set("dsp.start_trigger", nonsense);
            QCOMPARE(text("dsp.start_trigger"), QString());
        }
        set("dsp.message", "xyz");
        QCOMPARE(text("dsp.message"), QString());
        acknowledged("08000100", "01000000");
        QCOMPARE(program->packets().size(), 1);
    }

    void whatIsSetBeforeTheDspRunsIsSaidOnceItRuns()
    {
        set("dsp.log", "early");
        QCOMPARE(text("dsp.log"), QStringLiteral("early"));
        request(1, attachBody, done);
        request(2, armQueue, done);
        request(3, image, done);
        request(4, "", done);
        QCOMPARE(text("dsp.log"), QStringLiteral("early"));
        request(5, "", done);
        QTRY_COMPARE(program->messages(), Packets{"0210010006000000" + QByteArray("early").toHex() + "00"});
        QCOMPARE(text("dsp.log"), QString());
    }

    void idsAndLengthsCanBeWrong()
    {
        bringUp();
        set("dsp.message_id", 65281);
        set("dsp.log", "a");
        QTRY_COMPARE(program->packets().size(), 1);
        QCOMPARE(program->packets()[0].mid(2 * 30, 4), QByteArray("01ff"));
        program->forget();
        set("dsp.message_id", 100);
        set("dsp.length_error", -3);
        set("dsp.log", "a");
        QTRY_COMPARE(program->messages(), Packets{"02100100ffffffff6100"});
    }

    void sensorFramesComeAtTheirRateOnceTheReceiverIsEnabled()
    {
        bringUp();
        set("dsp.sensor_rate", 200);
        acknowledged("09000100", "01000000"); // nothing before it
        QCOMPARE(number("dsp.sensor_frames"), 0);
        QElapsedTimer clock;
        clock.start();
        QVERIFY(program->send(command("01000100", "01000000")));
        QTRY_VERIFY(program->messages().size() >= 42);
        QVERIFY2(clock.elapsed() >= 200, qPrintable(QString::number(clock.elapsed())));
        const auto frames = program->messages();
        QCOMPARE(frames[2].size(), 2 * (8 + 4 + 16 * 65 + 32));
        QVERIFY(frames[2].startsWith("0410010034040000"
                                     "00001004"
                                     "010064c80000010203"));
        QVERIFY(frames[3].startsWith("0410010034040000"
                                     "01001004"
                                     "010064c80001020304"));
        QVERIFY(program->send(command("01000100", "00000000")));
        QTRY_COMPARE(number("dsp.receiver"), 0);
        const auto made = number("dsp.sensor_frames");
        acknowledged("09000100", "00000000");
        QCOMPARE(number("dsp.sensor_frames"), made);
    }

    void sensorsCanBeFewOfAnotherTypeUpsampledOrWrong()
    {
        bringUp();
        set("dsp.sensors", 1);
        set("dsp.sensor_types", "31");
        acknowledged("01000100", "01000000");
        const auto nextFrame = [this] {
            program->forget();
            set("dsp.sensor_rate", 100);
            (void)QTest::qWaitFor([this] { return !program->messages().isEmpty(); });
            set("dsp.sensor_rate", 0);
            return program->messages().value(0);
        };
        QByteArray frame = nextFrame();
        QCOMPARE(frame.mid(2 * 12, 4), QByteArray("011f"));
        QCOMPARE(frame.mid(2 * (12 + 65), 2), QByteArray("00"));
        set("dsp.sensor_types", "invalid");
        QCOMPARE(nextFrame().mid(2 * 12, 4), QByteArray("0120"));
        set("dsp.sensor_ratio", 2);
        frame = nextFrame();
        QVERIFY(frame.startsWith("05100100"));
        QCOMPARE(frame.size(), 2 * (8 + 4 + 16 * 124 + 32));
        set("dsp.sensor_ratio", 0);
        acknowledged("04000100", "01000000"); // upsampling as the program commands
        QVERIFY(nextFrame().startsWith("05100100"));
        set("dsp.slot_size", 11);
        QCOMPARE(nextFrame().size(), 2 * (8 + 4 + 16 * 11 + 32));
        set("dsp.sensor_fault", "readings-length");
        QCOMPARE(nextFrame().mid(2 * 10, 4), QByteArray("c000"));
        set("dsp.sensor_fault", "indivisible");
        frame = nextFrame();
        QCOMPARE(frame.mid(2 * 10, 4), QByteArray("a800"));
        QCOMPARE(frame.size(), 2 * (8 + 4 + 168 + 32));
        set("dsp.sensor_fault", "short");
        QCOMPARE(nextFrame().size(), 2 * (8 + 3));
        set("dsp.sensor_fault", "none");
        set("dsp.slot_size", 4095);
        frame = nextFrame(); // cut to what a buffer holds, with the length that it would have had
        QCOMPARE(frame.size(), 2 * 2028);
        QCOMPARE(frame.mid(2 * 4, 8), word(4 + 16 * 4095 + 32));
    }

    void aProgramThatDoesNotReadLosesMessagesAndNothingElse()
    {
        bringUp();
        acknowledged("01000100", "01000000");
        set("dsp.sensor_rate", 1000);
        QTRY_VERIFY_WITH_TIMEOUT(number("dsp.messages_lost") > 0, 20'000);
        set("dsp.sensor_rate", 0);
        program->forget();
        QVERIFY(program->send(command("08000100", "01000000"))); // answered behind the frames that still wait
        QTRY_COMPARE(program->messages().value(program->messages().size() - 1), QByteArray("0b1001000400000008000100"));
    }
};

QTEST_GUILESS_MAIN(DspEventsTest)
#include "DspEventsTest.moc"
