// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/DspFixture.h"
#include "virtual-device/dsp/DspSocket.h"

#include <QElapsedTimer>
#include <QSignalSpy>
#include <QTimer>

using namespace DspModelTesting;

/// Driver and firmware: how the program comes up, what it commands and how that is answered.
class DspModelTest : public Fixture
{
    Q_OBJECT

private slots:
    void init() { setUp(); }
    void cleanup() { tearDown(); }

    void theProgramComesUpStepByStepAndGoesDownAgain()
    {
        QCOMPARE(text("dsp.state"), QStringLiteral("off"));
        request(1, attachBody, done);
        QCOMPARE(text("dsp.state"), QStringLiteral("attached"));
        request(2, armQueue, done);
        request(3, image, done);
        QCOMPARE(text("dsp.state"), QStringLiteral("loaded"));
        QCOMPARE(text("dsp.image"), QStringLiteral("/dsp.out"));
        request(4, "", done);
        QCOMPARE(text("dsp.state"), QStringLiteral("started"));
        request(5, "", done);
        QCOMPARE(text("dsp.state"), QStringLiteral("connected"));
        request(6, dspQueue, done, "01000000");
        request(7, "", done);
        QCOMPARE(text("dsp.state"), QStringLiteral("started"));
        request(8, "", done);
        QCOMPARE(text("dsp.state"), QStringLiteral("attached"));
        request(9, "01000100", done);
        request(10, "", done);
        QCOMPARE(text("dsp.state"), QStringLiteral("off"));
        bringUp(); // again on the same connection
        QCOMPARE(text("dsp.state"), QStringLiteral("connected"));
        QCOMPARE(number("dsp.connections"), 1);
        QCOMPARE(number("dsp.requests"), 16);
        QCOMPARE(number("dsp.violations"), 0);
    }

    void requestsOutOfOrderAreRefusedAndReported()
    {
        for (const int kind : {2, 3, 4, 5, 6, 7, 8, 9, 10})
            request(kind, armQueue, wrongState);
        QCOMPARE(number("dsp.violations"), 9);
        QCOMPARE(text("dsp.last_violation"), QStringLiteral("detach out of order"));
        request(1, attachBody, done);
        request(1, attachBody, wrongState);
        request(4, "", wrongState);
    }

    void anotherVersionOfTheProtocolIsRefused() { request(1, "02000000", "30800080"); }

    void whatIsNoPacketIsIgnored()
    {
        QVERIFY(program->send("0100"));
        QVERIFY(program->send("01000000 01000000"));              // attach without a version
        QVERIFY(program->send("6300000001000000"));               // unknown kind
        QVERIFY(program->send("0001000000000000 01000000 0000")); // half a message
        serial = 5;
        request(1, attachBody, done);
        QCOMPARE(program->packets().size(), 1);
    }

    void aQueueThatTheFirmwareHasNotIsNotFound()
    {
        bringUp();
        request(6, QByteArray("DSPMSGQ9").toHex(), notFound);
        set("dsp.locate", "missing");
        request(6, dspQueue, notFound);
    }

    void theSearchForTheQueueCanBeLateOrNeverAnswered()
    {
        bringUp();
        set("dsp.ack_delay", 300);
        set("dsp.locate", "late");
        QElapsedTimer clock;
        clock.start();
        request(6, dspQueue, done, "01000000");
        QVERIFY(clock.elapsed() >= 250); // a coarse timer
        set("dsp.locate", "never");
        program->forget();
        QVERIFY(program->send("06000000 63000000" + dspQueue));
        acknowledged("08000100", "01000000"); // the next thing that comes
        QCOMPARE(program->packets().size(), 1);
    }

    void eachRequestCanBeMadeToFail_data()
    {
        QTest::addColumn<QString>("name");
        QTest::addColumn<int>("failing");
        const QStringList names{"attach", "queue",           "load", "start",       "transport",
                                "locate", "transport-close", "stop", "queue-close", "detach"};
        for (int kind = 1; kind <= names.size(); ++kind)
            QTest::newRow(qPrintable(names[kind - 1])) << names[kind - 1] << kind;
    }

    void eachRequestCanBeMadeToFail()
    {
        QFETCH(QString, name);
        QFETCH(int, failing);
        set("dsp.refuse", name);
        const QList<QByteArray> bodies{attachBody, armQueue, image, "", "", dspQueue, "", "", "01000100", ""};
        for (int kind = 1; kind < failing; ++kind)
            request(kind, bodies[kind - 1], done, kind == 6 ? "01000000" : "00000000");
        request(failing, bodies[failing - 1], failed);
    }

    void noRequestIsAnsweredWhenRepliesAreOff()
    {
        bringUp();
        set("dsp.replies", false);
        program->forget();
        QVERIFY(program->send("0700000064000000")); // transport close
        acknowledged("08000100", "01000000");       // the next thing that comes
        QCOMPARE(program->packets().size(), 1);
        QCOMPARE(text("dsp.state"), QStringLiteral("connected"));
        set("dsp.replies", true);
        request(7, "", done);
    }

    void namesOfQueuesAreUniqueOverBothProcessors()
    {
        request(1, attachBody, done);
        request(2, "02000100" + dspQueue, failed);
        request(2, armQueue, done);
    }

    void everyCommandIsCarriedOutAndAcknowledged()
    {
        bringUp();
        acknowledged("01000100", "02000000");
        QCOMPARE(number("dsp.receiver"), 2);
        acknowledged("02000100", "01000000");
        QVERIFY(flag("dsp.long_range_antenna"));
        acknowledged("03000100", "ffffffff");
        QCOMPARE(number("dsp.trigger"), -1);
        acknowledged("04000100", "01000000");
        QVERIFY(flag("dsp.upsampling"));
        acknowledged("05000100", "07000000");
        QCOMPARE(number("dsp.line_noise_detection"), 7);
        acknowledged("06000100", "010000000c000000000000000000000000000000");
        QVERIFY(flag("dsp.pairing_mode"));
        QCOMPARE(number("dsp.pairing_parameter"), 12);
        acknowledged("07000100", "0100000002000000280000004a0000000a00000056341200");
        QVERIFY(flag("dsp.gathering"));
        QCOMPARE(text("dsp.channels"), QStringLiteral("2 40 74 10"));
        QCOMPARE(number("dsp.base_address"), 0x123456);
        acknowledged("08000100", "01000000");
        QVERIFY(flag("dsp.enabled"));
        acknowledged("09000100", "01000000");
        QCOMPARE(number("dsp.hardware_test"), 1);
        QCOMPARE(number("dsp.commands"), 9);
        QCOMPARE(number("dsp.messages_received"), 9);
        QCOMPARE(number("dsp.messages_sent"), 9);
        QCOMPARE(text("dsp.last_command"), QStringLiteral("0x10009 01000000"));
        QCOMPARE(number("dsp.violations"), 0);
    }

    void theVersionFollowsItsAcknowledgement()
    {
        bringUp();
        QVERIFY(program->send(command("00000100", "")));
        QTRY_COMPARE(program->messages(), (Packets{"0b1001000400000000000100", "00100100020000000201"}));
        program->forget();
        set("dsp.version", "12.34");
        set("dsp.version_reply", "short");
        QVERIFY(program->send(command("00000100", "")));
        QTRY_COMPARE(program->messages(), (Packets{"0b1001000400000000000100", "00100100010000000c"}));
        set("dsp.version_reply", "off");
        acknowledged("00000100", "");
    }

    void aRefusedCommandIsNotCarriedOut()
    {
        bringUp();
        set("dsp.ack", "nak");
        QVERIFY(program->send(command("01000100", "01000000")));
        QTRY_COMPARE(program->messages(), Packets{"0c1001000400000001000100"});
        QCOMPARE(number("dsp.receiver"), 0);
    }

    void answersCanBeLateMissingShortLostOrMisnamed()
    {
        bringUp();
        set("dsp.ack", "short");
        QVERIFY(program->send(command("09000100", "01000000")));
        QTRY_COMPARE(program->messages(), Packets{"0b10010003000000090001"});
        program->forget();
        set("dsp.ack", "wrong-id");
        QVERIFY(program->send(command("09000100", "02000000")));
        QTRY_COMPARE(program->packets().size(), 1);
        QCOMPARE(program->packets()[0].mid(2 * 30, 4), QByteArray("6500"));
        program->forget();
        set("dsp.ack", "lost");
        QVERIFY(program->send(command("09000100", "03000000")));
        QTRY_COMPARE(number("dsp.hardware_test"), 3);
        set("dsp.ack", "off");
        QVERIFY(program->send(command("09000100", "04000000")));
        QTRY_COMPARE(number("dsp.commands"), 4);
        QCOMPARE(number("dsp.hardware_test"), 3);
        QCOMPARE(program->packets().size(), 0);
        set("dsp.ack", "late");
        set("dsp.ack_delay", 300);
        QElapsedTimer clock;
        clock.start();
        acknowledged("09000100", "05000000");
        QVERIFY(clock.elapsed() >= 300);
    }

    void whatTheProgramDoesWrongIsReported()
    {
        bringUp();
        const QSignalSpy spy(dsp.get(), &DspModel::violated);
        QVERIFY(program->send(command("01000100", "01000000", "4200")));
        QTRY_COMPARE(text("dsp.last_violation"), QStringLiteral("message id 66"));
        QVERIFY(program->send(command("0a000100", "01000000")));
        QTRY_COMPARE(text("dsp.last_violation"), QStringLiteral("command 0x1000a with 4 payload bytes"));
        QTRY_COMPARE(program->messages(), Packets{"0c100100040000000a000100"});
        QVERIFY(program->send(command("01000100", "0100000002000000")));
        QTRY_COMPARE(text("dsp.last_violation"), QStringLiteral("command 0x10001 with 8 payload bytes"));
        QVERIFY(program->send(command("01000100", "").replace(2 * 36, 8, "ffffffff")));
        QTRY_COMPARE(text("dsp.last_violation"),
                     QStringLiteral("payload length 4294967295 in a message of 2028 bytes"));
        QCOMPARE(number("dsp.receiver"), 0);
        QCOMPARE(number("dsp.violations"), 4);
        QCOMPARE(spy.size(), 4);
    }

    void aSecondCommandWhileOneIsUnacknowledgedIsReported()
    {
        bringUp();
        set("dsp.ack", "off");
        QVERIFY(program->send(command("08000100", "01000000")));
        QVERIFY(program->send(command("09000100", "01000000")));
        QTRY_COMPARE(text("dsp.last_violation"), QStringLiteral("command 0x10009 while another is unacknowledged"));
    }

    void theEndOfTheConnectionStopsTheDsp()
    {
        bringUp();
        acknowledged("01000100", "02000000");
        program.reset();
        QTRY_COMPARE(text("dsp.state"), QStringLiteral("off"));
        QCOMPARE(number("dsp.receiver"), 0);
        QCOMPARE(text("dsp.image"), QString());
        connectProgram();
        bringUp();
        QCOMPARE(number("dsp.connections"), 2);
    }

    void aStopForgetsWhatTheDspWasTold()
    {
        bringUp();
        acknowledged("01000100", "02000000");
        acknowledged("09000100", "01000000");
        request(7, "", done);
        request(8, "", done);
        QCOMPARE(number("dsp.receiver"), 0);
        QCOMPARE(number("dsp.hardware_test"), 0);
    }

    void aSecondProgramIsTurnedAwayWhileTheFirstIsThere()
    {
        bringUp();
        SocketClient second(path);
        QTRY_VERIFY(second.closed());
        acknowledged("08000100", "01000000");
    }

    void aProgramThatStartsAgainAtOnceIsTaken()
    {
        for (int round = 0; round < 20; ++round) {
            bringUp();
            program.reset();
            connectProgram(); // before the model has run at all
        }
        bringUp();
        QCOMPARE(text("dsp.state"), QStringLiteral("connected"));
    }

    void theDeviceCanBeMissingOrRefuseAndReturn()
    {
        set("dsp.presence", "missing");
        QTRY_VERIFY(program->closed());
        QVERIFY(!QFile::exists(path));
        set("dsp.presence", "refusing");
        QVERIFY(QFile::exists(path));
        QCOMPARE(SocketClient(path).error, ECONNREFUSED);
        set("dsp.presence", "present");
        connectProgram();
        bringUp();
    }

    void aProgramThatSendsWithoutEndLeavesTheThreadToOthers()
    {
        constexpr int plenty = 20'000;
        const QString name = path + QStringLiteral("-endless");
        VirtualDevice::DspSocket socket;
        QVERIFY(!socket.listen(name));
        const SocketClient sender(name);
        QTRY_VERIFY(socket.isConnected());
        int packets = 0;
        connect(&socket, &VirtualDevice::DspSocket::received, this, [&] { // there is always one more to read
            if (++packets < plenty)
                QVERIFY(sender.send("00"));
        });
        int packetsBeforeOthers = 0;
        QVERIFY(sender.send("00"));
        QTRY_VERIFY(packets > 0);
        QTimer::singleShot(0, this, [&] { packetsBeforeOthers = packets; });
        QTRY_COMPARE(packets, plenty);
        QVERIFY(packetsBeforeOthers > 0);
        QVERIFY(packetsBeforeOthers < plenty);
    }

    void aPathThatCannotBeServedIsReported()
    {
        DspModel other(*registry);
        const auto problem = other.open(QStringLiteral("/nowhere/dsplink"));
        QVERIFY(problem);
        QVERIFY(problem->contains(QStringLiteral("/nowhere/dsplink")));
    }
};

QTEST_GUILESS_MAIN(DspModelTest)
#include "DspModelTest.moc"
