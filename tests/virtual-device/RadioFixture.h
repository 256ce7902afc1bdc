// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "tests/virtual-device/RegistryAccess.h"
#include "virtual-device/radio/RadioFrame.h"
#include "virtual-device/radio/RadioFrameReader.h"
#include "virtual-device/radio/RadioModel.h"

#include <QSignalSpy>
#include <QTest>

#include <fcntl.h>
#include <termios.h>
#include <unistd.h>

namespace RadioTest
{

using namespace VirtualDevice;

inline QByteArray bytes(const char* hex)
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

inline QByteArray joined(const QSignalSpy& deliveries)
{
    QByteArray result;
    for (const auto& call : deliveries)
        result += call[0].toByteArray();
    return result;
}

/// A radio, its registry and a program's end of its line, anew for every case.
class Fixture : public TestSupport::RegistryAccess
{
protected:
    std::unique_ptr<RadioModel> radio;
    std::unique_ptr<TtyClient> tty;

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

    /// The numbers of the first 20 of a row of numbered packets that come in at a new radio through a line with the
    /// fault.
    QStringList arrivedThrough(const QString& fault, int seed)
    {
        tearDown();
        setUp();
        constexpr qsizetype wanted = 20;
        QStringList arrived;
        const auto seen =
            QObject::connect(registry.get(), &Registry::changed, [&](const QString& name, const QJsonValue& value) {
                if (name == u"radio.last_command")
                    arrived.append(value.toString().right(4));
            });
        const QString rate = QStringLiteral("radio.to_radio.") + fault;
        set("radio.ack", "off");
        set("radio.line_seed", seed);
        (void)registry->set(rate, 2'000);
        for (int number = 0; arrived.size() < wanted && number < 1000; ++number) {
            const auto digits = QByteArray::number(0x1000 + number, 16);
            (void)tty->write(radioFrame(bytes("02 000001 02 00 01020304") + QByteArray::fromHex(digits)));
            QCoreApplication::processEvents();
        }
        (void)QTest::qWaitFor([&] { return arrived.size() >= wanted; });
        QObject::disconnect(seen);
        return arrived.first(std::min(arrived.size(), wanted));
    }

    void setUp()
    {
        registry = std::make_unique<Registry>();
        radio = std::make_unique<RadioModel>(*registry);
        tty = std::make_unique<TtyClient>(radio->devicePath());
        radio->reset();
        QTRY_COMPARE(number("radio.resets"), 1);
    }

    void tearDown()
    {
        tty.reset();
        radio.reset();
        registry.reset();
    }
};

} // namespace RadioTest
