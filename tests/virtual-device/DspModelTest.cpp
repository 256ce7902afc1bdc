// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/dsp/DspModel.h"

#include "virtual-device/registry/Registry.h"

#include <QElapsedTimer>
#include <QFile>
#include <QSignalSpy>
#include <QTest>

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>

using namespace VirtualDevice;

namespace
{

QByteArray bytes(const QByteArray& hex)
{
    return QByteArray::fromHex(hex);
}

QByteArray word(quint32 number)
{
    return QByteArray::number(qToBigEndian(number), 16).rightJustified(8, '0');
}

/// The program's end of the socket: packets as hexadecimal text, and nothing of ours but send and receive.
class SocketClient
{
public:
    explicit SocketClient(const QString& path)
        : descriptor(::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_NONBLOCK | SOCK_CLOEXEC, 0))
    {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path.toLocal8Bit().constData(), sizeof address.sun_path - 1);
        if (::connect(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0)
            error = errno;
    }
    ~SocketClient() { ::close(descriptor); }
    SocketClient(const SocketClient&) = delete;
    SocketClient& operator=(const SocketClient&) = delete;

    bool send(const QByteArray& hex) const
    {
        const QByteArray packet = bytes(hex);
        return ::send(descriptor, packet.constData(), static_cast<std::size_t>(packet.size()), MSG_NOSIGNAL) ==
               packet.size();
    }

    /// Everything that has come so far, packet by packet.
    const QList<QByteArray>& packets()
    {
        QByteArray packet(4096, Qt::Uninitialized);
        while (!isClosed) {
            const auto count = ::recv(descriptor, packet.data(), static_cast<std::size_t>(packet.size()), 0);
            if (count < 0)
                break;
            if (count == 0)
                isClosed = true;
            else
                arrived.append(packet.first(count).toHex());
        }
        return arrived;
    }

    /// The data of the messages so far, headers cut off.
    QList<QByteArray> messages()
    {
        QList<QByteArray> result;
        for (const auto& packet : packets())
            if (packet.startsWith("0001"))
                result.append(packet.mid(2 * 32));
        return result;
    }

    bool closed()
    {
        (void)packets();
        return isClosed;
    }
    void forget()
    {
        (void)packets();
        arrived.clear();
    }

    int error = 0;

private:
    int descriptor;
    QList<QByteArray> arrived;
    bool isClosed = false;
};

using Packets = QList<QByteArray>;

const QByteArray done = "00800000";
const QByteArray failed = "08800080";
const QByteArray wrongState = "1b800080";
const QByteArray notFound = "2d800080";

const QByteArray attachBody = "01000000";
const QByteArray armQueue = "01000100" + QByteArray("GPPMSGQ1").toHex();
const QByteArray image = QByteArray("/dsp.out").toHex();
const QByteArray dspQueue = QByteArray("DSPMSGQ0").toHex();

} // namespace

class DspModelTest : public QObject
{
    Q_OBJECT

    std::unique_ptr<Registry> registry;
    std::unique_ptr<DspModel> dsp;
    std::unique_ptr<SocketClient> program;
    quint32 serial = 0;
    const QString path = QStringLiteral("/tmp/dsplink-%1").arg(::getpid());

    void set(const char* name, const QJsonValue& value) const
    {
        const auto wrong = registry->set(QString::fromLatin1(name), value);
        QVERIFY2(!wrong, qPrintable(wrong.value_or(QString())));
    }
    [[nodiscard]] qint64 number(const char* name) const { return registry->integer(QString::fromLatin1(name)); }
    [[nodiscard]] QString text(const char* name) const { return registry->text(QString::fromLatin1(name)); }
    [[nodiscard]] bool flag(const char* name) const { return registry->flag(QString::fromLatin1(name)); }

    /// Asks and waits for the one reply: status and value.
    void request(int kind, const QByteArray& body, const QByteArray& status, const QByteArray& value = "00000000")
    {
        ++serial;
        const QByteArray expected = "80000000" + word(serial) + status + value;
        QVERIFY(program->send(QByteArray::number(kind, 16).rightJustified(2, '0') + "000000" + word(serial) + body));
        QTRY_VERIFY2(program->packets().contains(expected), program->packets().join(' ').constData());
    }

    void connectProgram()
    {
        program = std::make_unique<SocketClient>(path);
        QCOMPARE(program->error, 0);
        serial = 0;
    }

    void bringUp()
    {
        request(1, attachBody, done);
        request(2, armQueue, done);
        request(3, image, done);
        request(4, "", done);
        request(5, "", done);
        request(6, dspQueue, done, "01000000");
        program->forget();
    }

    /// A command as the program sends it: a whole buffer, header and zeros included.
    [[nodiscard]] QByteArray command(const QByteArray& code, const QByteArray& payload,
                                     const QByteArray& id = "4100") const
    {
        QByteArray message = "0001 0000 00000000 01000000 0000000000000000 0100 0000 0008 0100 0100" + id + code +
                             word(static_cast<quint32>(payload.size() / 2)) + payload;
        message.replace(' ', "");
        return message.leftJustified(2 * (12 + 2048), '0');
    }

    void acknowledged(const QByteArray& code, const QByteArray& payload)
    {
        program->forget();
        QVERIFY(program->send(command(code, payload)));
        QTRY_COMPARE(program->messages(), Packets{"0b10010004000000" + code});
    }

private slots:
    void init()
    {
        registry = std::make_unique<Registry>();
        dsp = std::make_unique<DspModel>(*registry);
        const auto problem = dsp->open(path);
        QVERIFY2(!problem, qPrintable(problem.value_or(QString())));
        connectProgram();
    }

    void cleanup()
    {
        program.reset();
        dsp.reset();
        registry.reset();
        QVERIFY(!QFile::exists(path));
    }

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
        const QStringList names{"attach", "queue", "load", "start", "transport", "locate"};
        for (int kind = 1; kind <= names.size(); ++kind)
            QTest::newRow(qPrintable(names[kind - 1])) << names[kind - 1] << kind;
    }

    void eachRequestCanBeMadeToFail()
    {
        QFETCH(QString, name);
        QFETCH(int, failing);
        set("dsp.refuse", name);
        const QList<QByteArray> bodies{attachBody, armQueue, image, "", "", dspQueue};
        for (int kind = 1; kind < failing; ++kind)
            request(kind, bodies[kind - 1], done, kind == 6 ? "01000000" : "00000000");
        request(failing, bodies[failing - 1], failed);
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

    void aPathThatCannotBeServedIsReported()
    {
        DspModel other(*registry);
        const auto problem = other.open(QStringLiteral("/nowhere/dsplink"));
        QVERIFY(problem);
        QVERIFY(problem->contains(QStringLiteral("/nowhere/dsplink")));
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

QTEST_GUILESS_MAIN(DspModelTest)
#include "DspModelTest.moc"
