// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/SerialProtocol.h"

#include "Domain/src/DomainLayer/SerialPort.h"
#include "tests/Domain/Frames.h"
#include "tests/Domain/Pty.h"
#include "tests/support/LogCapture.h"

#include <QDir>
#include <QEventLoop>
#include <QFile>
#include <QSignalSpy>
#include <QTest>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <future>
#include <thread>

using Domain::SerialPort;
using Domain::SerialProtocol;
using TestSupport::frameOf;
using TestSupport::Generator;
using TestSupport::LogCapture;
using TestSupport::Pty;

namespace
{

const QString resetFolder = "/sys/class/misc/msp430";
const QString resetFile = "/sys/class/misc/msp430/reset";
const QByteArray silence(200, '\0');

/// A protocol on a real line, whose other end is the test.
class Link : public QObject
{
public:
    Link() : port(pty.name(), SerialPort::Baud115200), protocol(port)
    {
        QObject::connect(&protocol, &SerialProtocol::messageReceived, this,
                         [this](const QByteArray& message) { messages.append(message); });
    }

    [[nodiscard]] bool receives(qsizetype count) const
    {
        return QTest::qWaitFor([&] { return messages.size() >= count; }, 20000);
    }
    /// Whatever the line has been given is parsed once a last good message has come out.
    [[nodiscard]] bool settles()
    {
        pty.write(silence + frameOf("settled"));
        const bool settled = QTest::qWaitFor([&] { return messages.contains("settled"); }, 20000);
        messages.removeAll("settled");
        return settled;
    }

    Pty pty;
    SerialPort port;
    SerialProtocol protocol;
    QList<QByteArray> messages;
};

/// A real port that counts what is written to it.
class CountingPort : public SerialPort
{
public:
    using SerialPort::SerialPort;

    int writes = 0;

protected:
    qint64 writeData(const char* bytes, qint64 count) override
    {
        ++writes;
        return SerialPort::writeData(bytes, count);
    }
};

/// Gives what it has in pieces, and may be filled again while it is read.
class PieceDevice : public QIODevice
{
public:
    [[nodiscard]] bool isSequential() const override { return true; }
    [[nodiscard]] qint64 bytesAvailable() const override
    {
        return (tellsItsSize ? bytes.size() : 0) + QIODevice::bytesAvailable();
    }
    bool open(OpenMode mode) override { return QIODevice::open(mode | Unbuffered); }

    QByteArray bytes;
    QByteArray refill; ///< added after every piece
    qint64 longestPiece = 30;
    bool tellsItsSize = true;

protected:
    qint64 readData(char* destination, qint64 maximum) override
    {
        const auto count = std::min({maximum, longestPiece, static_cast<qint64>(bytes.size())});
        std::copy_n(bytes.constData(), count, destination);
        bytes.remove(0, count);
        bytes += refill;
        return count;
    }
    qint64 writeData(const char* /*source*/, qint64 count) override { return count; }
};

void makeResetFile()
{
    QDir().mkpath(resetFolder);
    QFile file(resetFile);
    QVERIFY(file.open(QIODevice::WriteOnly));
}

QByteArray resetFileContent()
{
    QFile file(resetFile);
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray("(none)");
}

} // namespace

class SerialProtocolTest : public QObject
{
    Q_OBJECT

private slots:
    void init()
    {
        makeResetFile();
        log = std::make_unique<LogCapture>();
    }
    void cleanup()
    {
        log.reset();
        QFile::remove(resetFile);
    }

    void opensTheDeviceAndPulsesTheResetLine();
    void theResetLineIsPulsedOnce();
    void aMissingResetLineIsReportedWithItsPath();
    void aResetLineWhoseLinkLeadsNowhereIsMissing();
    void aResetLineThatCannotBeOpenedIsReported();
    void aResetLineThatCannotBeWrittenIsReported();
    void aDeviceThatCannotBeOpenedIsReportedAndTheResetLineStillPulsed();
    void theDeviceIsOpenedBeforeTheResetLineIsPulsed();
    void theDeviceStaysOpenWhenTheProtocolGoes();
    void sentMessagesAreFramed_data();
    void sentMessagesAreFramed();
    void aFrameLeavesInASingleWrite();
    void theLengthFieldOfAHugeMessageIsCutTo16Bits();
    void aFailedSendIsReported();
    void aFrameIsDeliveredWithoutItsWrapping();
    void anEmptyPayloadIsDelivered();
    void aHundredBytesAreDeliveredAHundredAndOneRefused();
    void aSplitFrameIsDeliveredWithItsLastByte();
    void twoFramesInOneReadArriveInOrder();
    void noiseBeforeAFrameIsDropped();
    void noiseWithoutAStartByteLeavesNoTraceInTheLog();
    void refusalsAreReported_data();
    void refusalsAreReported();
    void aStartByteWithinARefusedFrameIsTriedNext();
    void aFrameBehindADamagedOneArrivesOverTheLine();
    void randomFramesAmongGarbageArriveOverTheLine();
    void livesOnAnotherThreadThanThePort();
    void aMessageHandlerMayParseAgain();
    void aKeptMessageStaysAsItWas();
    void everyReceiverGetsTheMessageEvenIfOneParsesOn();
    void aDeviceIsReadUntilItIsEmpty_data();
    void aDeviceIsReadUntilItIsEmpty();
    void aFloodedLineDoesNotHoldTheThread();
    void aFloodThatBeginsAfterTheLookDoesNotHoldTheThread();

private:
    std::unique_ptr<LogCapture> log;
};

void SerialProtocolTest::opensTheDeviceAndPulsesTheResetLine()
{
    const Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    const SerialProtocol protocol(port);
    QVERIFY(port.isOpen());
    QCOMPARE(port.openMode(), QIODevice::ReadWrite | QIODevice::Unbuffered);
    QCOMPARE(resetFileContent(), QByteArray("1"));
    QCOMPARE(log->texts(), QStringList());
}

/// A pipe keeps every write, where a file is emptied each time that it is opened.
void SerialProtocolTest::theResetLineIsPulsedOnce()
{
    QVERIFY(QFile::remove(resetFile));
    QCOMPARE(::mkfifo(qPrintable(resetFile), S_IRUSR | S_IWUSR), 0);
    const int pipe = ::open(qPrintable(resetFile), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    {
        Link link;
        QVERIFY(link.settles());
    }
    std::array<char, 8> pulses{};
    QCOMPARE(::read(pipe, pulses.data(), pulses.size()), ssize_t(1));
    ::close(pipe);
    QCOMPARE(pulses.front(), '1');
    QCOMPARE(log->texts(), QStringList());
}

void SerialProtocolTest::aResetLineWhoseLinkLeadsNowhereIsMissing()
{
    QVERIFY(QFile::remove(resetFile));
    QVERIFY(QFile::link("/sys/class/misc/msp430/gone", resetFile));
    const Link link;
    QVERIFY(log->waitFor(", Beacon processor reset line device file does not exist at" + resetFile));
    QCOMPARE(log->lines().size(), std::size_t(1));
}

void SerialProtocolTest::aMissingResetLineIsReportedWithItsPath()
{
    QVERIFY(QFile::remove(resetFile));
    const Link link;
    QVERIFY(log->waitFor(", Beacon processor reset line device file does not exist at/sys/class/misc/msp430/reset"));
    QVERIFY(log->texts().front().startsWith("Domain/src/DomainLayer/SerialProtocol"));
    QCOMPARE(log->lines().size(), std::size_t(1));
    QVERIFY(!QFile::exists(resetFile));
}

void SerialProtocolTest::aResetLineThatCannotBeOpenedIsReported()
{
    QVERIFY(QFile::setPermissions(resetFile, QFile::ReadOwner));
    const Link link;
    QVERIFY(log->waitFor(", Cannot open beacon processor reset line device file for writing"));
    QCOMPARE(log->lines().size(), std::size_t(1));
}

void SerialProtocolTest::aResetLineThatCannotBeWrittenIsReported()
{
    QVERIFY(QFile::remove(resetFile));
    QVERIFY(QFile::link("/dev/full", resetFile));
    const Link link;
    QVERIFY(log->waitFor(", Cannot write to beacon processor reset line device file"));
    QCOMPARE(log->lines().size(), std::size_t(1));
}

void SerialProtocolTest::aDeviceThatCannotBeOpenedIsReportedAndTheResetLineStillPulsed()
{
    SerialPort port("/dev/ttyS1", SerialPort::Baud115200);
    SerialProtocol protocol(port);
    QVERIFY(log->waitFor(", Unable to open beacon serial port"));
    QCOMPARE(resetFileContent(), QByteArray("1"));
    QVERIFY(!protocol.sendMessage("x"));
    QVERIFY(log->waitFor(", Unable to send serial packet"));
}

/// Otherwise the microcontroller's first words would come before anybody listens.
void SerialProtocolTest::theDeviceIsOpenedBeforeTheResetLineIsPulsed()
{
    QVERIFY(QFile::remove(resetFile));
    SerialPort port("/dev/ttyS1", SerialPort::Baud115200);
    const SerialProtocol protocol(port);
    QVERIFY(log->waitFor(", Beacon processor reset line device file does not exist at" + resetFile));
    QCOMPARE(log->lines().size(), std::size_t(3));
    QVERIFY(log->texts().at(1).endsWith(", Unable to open beacon serial port"));
    QVERIFY(log->texts().at(2).endsWith(resetFile));
}

void SerialProtocolTest::theDeviceStaysOpenWhenTheProtocolGoes()
{
    const Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    std::make_unique<SerialProtocol>(port).reset();
    QVERIFY(port.isOpen());
    pty.write("x");
    QTRY_COMPARE(port.bytesAvailable(), qint64(1));
}

void SerialProtocolTest::sentMessagesAreFramed_data()
{
    QTest::addColumn<QByteArray>("payload");
    QTest::addColumn<QByteArray>("wire");
    QTest::addRow("empty") << QByteArray() << QByteArray::fromHex("7C 0000 0000 007C 0A");
    QTest::addRow("ping") << QByteArray("\x7E") << QByteArray::fromHex("7C 0001 007E 00FB 7E 0A");
    QTest::addRow("unsigned sums") << QByteArray(2, '\xFF') << QByteArray::fromHex("7C 0002 01FE 017D FFFF 0A");
    const QByteArray longer(300, '\xFF');
    QTest::addRow("beyond the receiver's limit")
        << longer << QByteArray::fromHex("7C 012C 2AD4 01A7") + longer + QByteArray("\n");
}

void SerialProtocolTest::sentMessagesAreFramed()
{
    QFETCH(const QByteArray, payload);
    QFETCH(const QByteArray, wire);
    Link link;
    QVERIFY(link.protocol.sendMessage(payload));
    QCOMPARE(link.pty.read(wire.size()).toHex(), wire.toHex());
}

void SerialProtocolTest::aFrameLeavesInASingleWrite()
{
    const Pty pty;
    CountingPort port(pty.name(), SerialPort::Baud115200);
    SerialProtocol protocol(port);
    QVERIFY(protocol.sendMessage(QByteArray(100, 'x')));
    QCOMPARE(port.writes, 1);
    QVERIFY(protocol.sendMessage({}));
    QCOMPARE(port.writes, 2);
}

void SerialProtocolTest::theLengthFieldOfAHugeMessageIsCutTo16Bits()
{
    Link link;
    constexpr qsizetype size = 65536 + 3;
    QVERIFY(link.protocol.sendMessage(QByteArray(size, '\x01')));
    // The driver may take only the beginning, which is enough.
    QCOMPARE(link.pty.read(7).left(7).toHex(), QByteArray::fromHex("7C 0003 0003 0082").toHex());
}

void SerialProtocolTest::aFailedSendIsReported()
{
    Link link;
    link.pty.hangUp();
    QVERIFY(!link.protocol.sendMessage("x"));
    QVERIFY(log->waitFor(", Unable to send serial packet"));
    QVERIFY(log->waitFor(", Serial port write failed.  Error code = Input/output error"));
}

void SerialProtocolTest::aFrameIsDeliveredWithoutItsWrapping()
{
    Link link;
    link.pty.write(QByteArray::fromHex("7C 0003 0069 00E8 7B 0A E4 0A"));
    QVERIFY(link.settles());
    QCOMPARE(link.messages, QList<QByteArray>());
    link.pty.write(QByteArray::fromHex("7C 0003 0169 00E9 7B 0A E4 0A"));
    QVERIFY(link.receives(1));
    QCOMPARE(link.messages.front().toHex(), QByteArray("7b0ae4"));
}

void SerialProtocolTest::anEmptyPayloadIsDelivered()
{
    Link link;
    link.pty.write(QByteArray::fromHex("7C 0000 0000 007C 0A"));
    QVERIFY(link.receives(1));
    QCOMPARE(link.messages, QList<QByteArray>{QByteArray()});
    QCOMPARE(log->texts(), QStringList());
}

void SerialProtocolTest::aHundredBytesAreDeliveredAHundredAndOneRefused()
{
    Link link;
    const QByteArray longest(100, 'y');
    link.pty.write(frameOf(QByteArray(101, 'x')) + frameOf(longest));
    QVERIFY(link.receives(1));
    QCOMPARE(link.messages, QList<QByteArray>{longest});
    QVERIFY(log->waitFor(", Received too large of a payload length"));
    QCOMPARE(log->lines().size(), std::size_t(1));
}

void SerialProtocolTest::aSplitFrameIsDeliveredWithItsLastByte()
{
    Link link;
    const QByteArray frame = frameOf("split");
    for (qsizetype index = 0; index + 1 < frame.size(); ++index) {
        link.pty.write(frame.mid(index, 1));
        // Looked at once a turn: a byte still on its way through the terminal counts as waiting only when it is there.
        QVERIFY(QTest::qWaitFor([&] { return link.pty.waiting() == 0 && link.port.bytesAvailable() == 0; }));
    }
    QCOMPARE(link.messages, QList<QByteArray>());
    link.pty.write(frame.right(1));
    QVERIFY(link.receives(1));
    QCOMPARE(link.messages, QList<QByteArray>{"split"});
}

void SerialProtocolTest::twoFramesInOneReadArriveInOrder()
{
    Link link;
    link.pty.write(frameOf("one") + frameOf("two"));
    QVERIFY(link.receives(2));
    QCOMPARE(link.messages, (QList<QByteArray>{"one", "two"}));
}

void SerialProtocolTest::noiseBeforeAFrameIsDropped()
{
    Link link;
    link.pty.write("noise" + frameOf("good"));
    QVERIFY(link.receives(1));
    QCOMPARE(link.messages, QList<QByteArray>{"good"});
    QCOMPARE(log->texts(), QStringList());
}

void SerialProtocolTest::noiseWithoutAStartByteLeavesNoTraceInTheLog()
{
    Link link;
    link.pty.write(QByteArray(5000, '\n'));
    QVERIFY(link.settles());
    QCOMPARE(link.messages, QList<QByteArray>());
    QCOMPARE(log->texts(), QStringList());
}

void SerialProtocolTest::refusalsAreReported_data()
{
    QTest::addColumn<QByteArray>("frame");
    QTest::addColumn<QString>("text");
    QByteArray header = frameOf("x");
    header[6] = static_cast<char>(header[6] + 1);
    QTest::addRow("header checksum, low byte") << header << "Received invalid header checksum";
    header = frameOf("x");
    header[5] = static_cast<char>(header[5] + 1);
    QTest::addRow("header checksum, high byte") << header << "Received invalid header checksum";
    QTest::addRow("length 101") << frameOf(QByteArray(101, '\0')) << "Received too large of a payload length";
    QTest::addRow("length 65535") << frameOf("", 65535, 0) << "Received too large of a payload length";
    QTest::addRow("data checksum, low byte") << frameOf("x", 1, 'x' + 1) << "Received invalid data checksum";
    QTest::addRow("data checksum, high byte") << frameOf("x", 1, 'x' + 256) << "Received invalid data checksum";
    QTest::addRow("end byte") << frameOf("x", 1, 'x', '\r') << "Did not receive end-of-packet byte";
    QTest::addRow("end byte, no payload") << frameOf("", 0, 0, 'x') << "Did not receive end-of-packet byte";
}

void SerialProtocolTest::refusalsAreReported()
{
    QFETCH(const QByteArray, frame);
    QFETCH(const QString, text);
    Link link;
    link.pty.write(frame);
    QVERIFY(link.settles());
    QCOMPARE(link.messages, QList<QByteArray>());
    QVERIFY(log->waitFor(", " + text));
    QVERIFY(log->texts().front().startsWith("Domain/src/DomainLayer/SerialProtocol"));
    QCOMPARE(log->count(", " + text), 1);
}

void SerialProtocolTest::aStartByteWithinARefusedFrameIsTriedNext()
{
    Link link;
    // A damaged frame whose payload is an intact one.
    link.pty.write(frameOf("<" + frameOf("inner") + ">", 15, 0));
    QVERIFY(link.receives(1));
    QVERIFY(link.settles());
    QCOMPARE(link.messages, QList<QByteArray>{"inner"});
    QVERIFY(log->waitFor(", Received invalid data checksum"));
    QCOMPARE(log->lines().size(), std::size_t(1));
}

/// Each bit of a frame flipped in turn, and each of its beginnings.
void SerialProtocolTest::aFrameBehindADamagedOneArrivesOverTheLine()
{
    const QByteArray whole = frameOf("|whole\n");
    QList<QByteArray> damaged;
    for (qsizetype index = 0; index < whole.size(); ++index) {
        damaged.append(whole.left(index));
        for (int bit = 0; bit < 8; ++bit) {
            damaged.append(whole);
            damaged.last()[index] = static_cast<char>(whole.at(index) ^ (1 << bit));
        }
    }
    Link link;
    QList<QByteArray> expected;
    for (const auto& bad : damaged) {
        expected.append("next " + QByteArray::number(expected.size()));
        link.pty.write(bad + frameOf(expected.last()) + silence);
    }
    QVERIFY(link.receives(expected.size()));
    QVERIFY(link.settles());
    QCOMPARE(link.messages, expected);
}

void SerialProtocolTest::randomFramesAmongGarbageArriveOverTheLine()
{
    Generator generator(31);
    const auto payloads = TestSupport::randomPayloads(generator, 500);
    QByteArray stream;
    for (const auto& payload : payloads)
        stream += TestSupport::randomBytes(generator, TestSupport::randomBetween(generator, 0, 40)) + frameOf(payload);
    Link link;
    std::thread peer([&] {
        for (const auto& piece : TestSupport::randomPieces(generator, stream + silence, 150))
            link.pty.write(piece);
    });
    const bool complete = link.receives(payloads.size());
    peer.join();
    QVERIFY(complete);
    QVERIFY(link.messages == payloads);
}

void SerialProtocolTest::livesOnAnotherThreadThanThePort()
{
    const Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    std::promise<SerialProtocol*> made;
    std::atomic<bool> deliveredThere = false;
    std::thread worker([&] {
        QEventLoop loop;
        SerialProtocol protocol(port);
        connect(&protocol, &SerialProtocol::messageReceived, &protocol, [&, here = std::this_thread::get_id()] {
            deliveredThere = std::this_thread::get_id() == here;
            loop.quit();
        });
        made.set_value(&protocol);
        loop.exec();
    });
    QVERIFY(made.get_future().get()->sendMessage("from the caller's thread"));
    QCOMPARE(TestSupport::payloadOf(pty.read(32)), QByteArray("from the caller's thread"));
    pty.write(frameOf("x"));
    worker.join();
    QVERIFY(deliveredThere);
}

void SerialProtocolTest::aMessageHandlerMayParseAgain()
{
    Link link;
    connect(&link.protocol, &SerialProtocol::messageReceived, this, [&] { link.protocol.processData(); });
    link.pty.write(frameOf("one") + frameOf("two") + frameOf("three"));
    QVERIFY(link.receives(3));
    QVERIFY(link.settles());
    QCOMPARE(link.messages, (QList<QByteArray>{"one", "two", "three"}));
}

/// A receiver on another thread, for example, looks at a message only later.
void SerialProtocolTest::aKeptMessageStaysAsItWas()
{
    Generator generator(32);
    const auto payloads = TestSupport::randomPayloads(generator, 50);
    Link link;
    QSignalSpy spy(&link.protocol, &SerialProtocol::messageReceived);
    for (const auto& payload : payloads)
        link.pty.write(frameOf(payload));
    QVERIFY(link.receives(payloads.size()));
    QVERIFY(link.messages == payloads);
    for (qsizetype index = 0; index < payloads.size(); ++index)
        QCOMPARE(spy.at(index).front().toByteArray(), payloads.at(index));
}

void SerialProtocolTest::everyReceiverGetsTheMessageEvenIfOneParsesOn()
{
    PieceDevice device;
    SerialProtocol protocol(device);
    connect(&protocol, &SerialProtocol::messageReceived, this, [&] { protocol.processData(); });
    QSignalSpy spy(&protocol, &SerialProtocol::messageReceived);
    device.bytes = frameOf("one") + frameOf("two");
    device.longestPiece = frameOf("one").size();
    protocol.processData();
    // The second receiver gets what the first one's parsing brings before it gets what the first one got.
    QCOMPARE(spy.count(), 2);
    QCOMPARE(spy.at(0).front().toByteArray(), QByteArray("two"));
    QCOMPARE(spy.at(1).front().toByteArray(), QByteArray("one"));
}

void SerialProtocolTest::aDeviceIsReadUntilItIsEmpty_data()
{
    QTest::addColumn<bool>("tellsItsSize");
    QTest::addRow("size known") << true;
    QTest::addRow("size unknown") << false;
}

void SerialProtocolTest::aDeviceIsReadUntilItIsEmpty()
{
    QFETCH(const bool, tellsItsSize);
    PieceDevice device;
    device.tellsItsSize = tellsItsSize;
    SerialProtocol protocol(device);
    QSignalSpy spy(&protocol, &SerialProtocol::messageReceived);
    Generator generator(33);
    const auto payloads = TestSupport::randomPayloads(generator, 300);
    for (const auto& payload : payloads)
        device.bytes += frameOf(payload);
    protocol.processData();
    QCOMPARE(device.bytes.size(), 0);
    QCOMPARE(spy.count(), payloads.size());
    for (qsizetype index = 0; index < payloads.size(); ++index)
        QCOMPARE(spy.at(index).front().toByteArray(), payloads.at(index));
}

/// What comes while the line is read is left for its own announcement: the thread has other events, too.
void SerialProtocolTest::aFloodedLineDoesNotHoldTheThread()
{
    PieceDevice device;
    SerialProtocol protocol(device);
    QSignalSpy spy(&protocol, &SerialProtocol::messageReceived);
    const QByteArray frame = frameOf(QByteArray(22, 'x'));
    device.bytes = frame + frame;
    device.refill = frame;
    protocol.processData();
    QCOMPARE(spy.count(), 2);
    device.refill.clear();
    protocol.processData();
    QCOMPARE(spy.count(), 4);
    QCOMPARE(device.bytes.size(), 0);
}

/// The device says that nothing is there, and then it never ends.
void SerialProtocolTest::aFloodThatBeginsAfterTheLookDoesNotHoldTheThread()
{
    PieceDevice device;
    device.tellsItsSize = false;
    SerialProtocol protocol(device);
    const QByteArray frame = frameOf(QByteArray(22, 'x'));
    constexpr qsizetype longest = 10'000;
    qsizetype received = 0;
    connect(&protocol, &SerialProtocol::messageReceived, this, [&] {
        if (++received == longest) // or the test would not end
            device.refill.clear();
    });
    device.longestPiece = frame.size();
    device.bytes = frame;
    device.refill = frame;
    protocol.processData();
    QVERIFY(received > 0);
    QVERIFY(received < longest);
    const auto first = received;
    protocol.processData();
    QVERIFY(received > first);
}

QTEST_GUILESS_MAIN(SerialProtocolTest)
#include "SerialProtocolTest.moc"
