// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/RadioModel.h"

#include "virtual-device/radio/RadioFrame.h"
#include "virtual-device/radio/RadioFrameReader.h"
#include "virtual-device/registry/Registry.h"

#include <QElapsedTimer>
#include <QSignalSpy>
#include <QTest>

#include <fcntl.h>
#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

#include <thread>

using namespace VirtualDevice;

namespace
{

QByteArray bytes(const char* hex)
{
    return QByteArray::fromHex(hex);
}

/// The program's end of the line: a terminal opened as the program opens it, and nothing of ours but read and write.
class TtyClient
{
public:
    explicit TtyClient(const QString& path)
        : descriptor(::open(path.toLocal8Bit().constData(), O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC))
    {
        ::tcflush(descriptor, TCIFLUSH);
    }
    ~TtyClient() { ::close(descriptor); }
    TtyClient(const TtyClient&) = delete;
    TtyClient& operator=(const TtyClient&) = delete;

    /// The line is served by the thread that writes here: it has to be let run when the terminal is full.
    [[nodiscard]] bool write(QByteArrayView data) const
    {
        return QTest::qWaitFor([&] {
            const auto count = ::write(descriptor, data.data(), static_cast<std::size_t>(data.size()));
            data = data.sliced(std::max<qsizetype>(count, 0));
            return data.isEmpty();
        });
    }

    ssize_t readOnce()
    {
        std::array<char, 4096> chunk{};
        const auto count = ::read(descriptor, chunk.data(), chunk.size());
        if (count > 0)
            heard.append(chunk.data(), count);
        return count;
    }

    const QByteArray& everything()
    {
        while (readOnce() > 0) {
        }
        return heard;
    }

    /// The payloads of all frames so far.
    QList<QByteArray> messages()
    {
        QList<QByteArray> result;
        RadioFrameReader reader;
        for (const auto& event : reader.feed(everything()))
            if (event.finding == RadioFrameReader::Finding::Frame)
                result.append(event.payload.toHex());
        return result;
    }

    void forget()
    {
        (void)everything();
        heard.clear();
    }

    [[nodiscard]] int fd() const { return descriptor; }

private:
    int descriptor;
    QByteArray heard;
};

using Messages = QList<QByteArray>;

QByteArray joined(const QSignalSpy& deliveries)
{
    QByteArray result;
    for (const auto& call : deliveries)
        result += call[0].toByteArray();
    return result;
}

} // namespace

class RadioModelTest : public QObject
{
    Q_OBJECT

    std::unique_ptr<Registry> registry;
    std::unique_ptr<RadioModel> radio;
    std::unique_ptr<TtyClient> tty;

    void set(const char* name, const QJsonValue& value) const
    {
        const auto wrong = registry->set(QString::fromLatin1(name), value);
        QVERIFY2(!wrong, qPrintable(wrong.value_or(QString())));
    }
    [[nodiscard]] qint64 number(const char* name) const { return registry->integer(QString::fromLatin1(name)); }
    [[nodiscard]] QString text(const char* name) const { return registry->text(QString::fromLatin1(name)); }
    [[nodiscard]] bool flag(const char* name) const { return registry->flag(QString::fromLatin1(name)); }
    void command(const char* hex) const { QVERIFY(tty->write(radioFrame(bytes(hex)))); }
    /// Sends a command and waits for its plain acknowledgement, which it then forgets.
    void acknowledged(const char* hex) const
    {
        command(hex);
        QTRY_COMPARE(tty->messages(), Messages{"fe"});
        tty->forget();
    }
    /// Everything that was under way on the line has passed: a text comes back behind it.
    void settle() const
    {
        set("radio.text", "settled");
        QTRY_VERIFY(tty->messages().contains(QByteArray("7b") + QByteArray("settled").toHex()));
    }

    /// What arrives of 500 bytes through a line with the fault.
    QByteArray heardThrough(const QString& fault, int seed) const
    {
        const QByteArray mark("\xff\xfe\xff\xfe");
        const QString rate = QStringLiteral("radio.to_program.") + fault;
        tty->forget();
        set("radio.line_seed", seed);
        (void)registry->set(rate, 20'000);
        set("radio.raw", QString::fromLatin1(QByteArray(500, 'A').toHex()));
        (void)registry->set(rate, 0);
        set("radio.raw", QString::fromLatin1(mark.toHex()));
        if (!QTest::qWaitFor([&] { return tty->everything().endsWith(mark); }))
            return {};
        return tty->everything().chopped(mark.size());
    }

private slots:
    void init()
    {
        registry = std::make_unique<Registry>();
        radio = std::make_unique<RadioModel>(*registry);
        tty = std::make_unique<TtyClient>(radio->devicePath());
        radio->reset();
        QTRY_COMPARE(number("radio.resets"), 1);
    }

    void cleanup()
    {
        tty.reset();
        radio.reset();
        registry.reset();
    }

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
        set("radio.ack", "late");
        set("radio.ack_delay", 200);
        command("7e");
        QTRY_COMPARE(number("radio.pings"), 1);
        radio->reset();
        QTRY_COMPARE(number("radio.resets"), 2);
        QVERIFY(!flag("radio.transmitting"));
        QVERIFY(!flag("radio.amplifier"));
        QVERIFY(!flag("radio.beacon"));
        QCOMPARE(number("radio.channel"), 0);
        QCOMPARE(number("radio.frequency"), 0);
        set("radio.ack", "on");
        QTest::qWait(300); // the answer that was under way would have come by now
        QCOMPARE(tty->messages(), Messages{});
        acknowledged("6401");
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

    void splitDeliveriesComeInSmallPiecesAndWhole()
    {
        set("radio.to_program.delivery", "split");
        LineDirection direction(*registry, QStringLiteral("radio.to_program"), 0);
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
        QTest::qWait(100);
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
        QTest::qWait(2600); // longer than the monitor expects a program to wait
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

QTEST_GUILESS_MAIN(RadioModelTest)
#include "RadioModelTest.moc"
