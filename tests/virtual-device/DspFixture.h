// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "tests/virtual-device/RegistryAccess.h"
#include "virtual-device/dsp/DspModel.h"

#include <QFile>
#include <QTest>
#include <QtEndian>

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>

namespace DspModelTesting
{

using namespace VirtualDevice;

inline QByteArray bytes(const QByteArray& hex)
{
    return QByteArray::fromHex(hex);
}

inline QByteArray word(quint32 number)
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

inline const QByteArray done = "00800000";
inline const QByteArray failed = "08800080";
inline const QByteArray wrongState = "1b800080";
inline const QByteArray notFound = "2d800080";

inline const QByteArray attachBody = "01000000";
inline const QByteArray armQueue = "01000100" + QByteArray("GPPMSGQ1").toHex();
inline const QByteArray image = QByteArray("/dsp.out").toHex();
inline const QByteArray dspQueue = QByteArray("DSPMSGQ0").toHex();

/// A DSP, its registry and a program's end of its socket, anew for every case.
class Fixture : public TestSupport::RegistryAccess
{
protected:
    std::unique_ptr<DspModel> dsp;
    std::unique_ptr<SocketClient> program;
    quint32 serial = 0;
    const QString path = QStringLiteral("/tmp/dsplink-%1").arg(::getpid());

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

    void setUp()
    {
        registry = std::make_unique<Registry>();
        dsp = std::make_unique<DspModel>(*registry);
        const auto problem = dsp->open(path);
        QVERIFY2(!problem, qPrintable(problem.value_or(QString())));
        connectProgram();
    }

    void tearDown()
    {
        program.reset();
        dsp.reset();
        registry.reset();
        QVERIFY(!QFile::exists(path));
    }
};

} // namespace DspModelTesting
