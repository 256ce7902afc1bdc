// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/screen/Screen.h"

#include <QElapsedTimer>
#include <QImage>
#include <QLocalServer>
#include <QLocalSocket>
#include <QSignalSpy>
#include <QTemporaryDir>
#include <QTest>
#include <QtEndian>

#include <memory>

using namespace VirtualDevice;

namespace
{

constexpr int limit = 20000;
constexpr quint16 width = 240;
constexpr quint16 height = 320;

template <typename Number> QByteArray bigEndian(Number number)
{
    QByteArray bytes(sizeof number, Qt::Uninitialized);
    qToBigEndian(number, bytes.data());
    return bytes;
}

/// Protocol version, no security, its result, and a screen of the given size.
QByteArray greeting(quint16 screenWidth = width, quint16 screenHeight = height)
{
    const auto bitsDepthEndianTrueColour = QByteArray::fromHex("20180001");
    const auto maximaAndShifts = QByteArray::fromHex("00ff00ff00ff100800000000");
    return "RFB 003.008\n" + QByteArray::fromHex("0101") + bigEndian(quint32(0)) + bigEndian(screenWidth) +
           bigEndian(screenHeight) + bitsDepthEndianTrueColour + maximaAndShifts + bigEndian(quint32(4)) + "test";
}

/// One update of the whole screen, every pixel the same, which the protocol sends blue first here.
QByteArray update(QRgb colour)
{
    const QByteArray pixel = QByteArray(1, char(qBlue(colour))) + char(qGreen(colour)) + char(qRed(colour)) + char(0);
    return QByteArray::fromHex("0000") + bigEndian(quint16(1)) + bigEndian(quint16(0)) + bigEndian(quint16(0)) +
           bigEndian(width) + bigEndian(height) + bigEndian(quint32(0)) + pixel.repeated(width * height);
}

/// Sends each new client the same bytes and then nothing more, whatever it asks.
class Server
{
public:
    explicit Server(const QByteArray& bytes)
    {
        QObject::connect(&server, &QLocalServer::newConnection, &server, [this, bytes] {
            client = server.nextPendingConnection();
            client->write(bytes);
            ++clients;
        });
        if (!server.listen(folder.filePath("vnc")))
            qFatal("The test cannot make its socket");
    }

    QTemporaryDir folder;
    QLocalServer server;
    QLocalSocket* client = nullptr;
    int clients = 0;
};

} // namespace

/// A VNC server that does not behave: a program that hangs, dies or is disturbed in the middle of its answer.
class ScreenDisturbanceTest : public QObject
{
    Q_OBJECT

private slots:
    void completeAnswerIsAPicture();
    void halfAnAnswerHoldsNobodyUp();
    void halfAnAnswerIsNoPicture();
    void silentServerHoldsNobodyUp();
    void serverThatHangsUpIsTriedAgain_data();
    void serverThatHangsUpIsTriedAgain();
};

void ScreenDisturbanceTest::completeAnswerIsAPicture()
{
    const Server server(greeting() + update(qRgb(1, 2, 3)));
    Screen screen;
    QSignalSpy updates(&screen, &Screen::updated);
    screen.open(server.server.fullServerName());
    QVERIFY(updates.wait(limit));
    QCOMPARE(updates.first().first(), QRect(0, 0, width, height));
    QCOMPARE(screen.picture().pixelColor(239, 319), QColor(1, 2, 3));
}

void ScreenDisturbanceTest::halfAnAnswerHoldsNobodyUp()
{
    const Server server(greeting() + update(qRgb(1, 2, 3)) + update(qRgb(4, 5, 6)).chopped(1000));
    auto screen = std::make_unique<Screen>();
    QSignalSpy updates(screen.get(), &Screen::updated);
    screen->open(server.server.fullServerName());
    QVERIFY(updates.wait(limit));
    // Its thread now waits for the rest.
    QVERIFY(screen->isConnected());
    QVERIFY(screen->press("F5"));
    QCOMPARE(screen->picture().pixelColor(0, 0), QColor(1, 2, 3));
    QElapsedTimer clock;
    clock.start();
    screen.reset();
    QVERIFY(clock.elapsed() < limit);
}

void ScreenDisturbanceTest::halfAnAnswerIsNoPicture()
{
    const Server server(greeting() + update(qRgb(4, 5, 6)).chopped(1));
    Screen screen;
    QSignalSpy opened(&screen, &Screen::opened);
    QSignalSpy updates(&screen, &Screen::updated);
    screen.open(server.server.fullServerName());
    QVERIFY(opened.wait(limit));
    QVERIFY(!updates.wait(300));
    QVERIFY(screen.picture().isNull());
    server.client->write(QByteArray(1, 0));
    QVERIFY(updates.wait(limit));
    QCOMPARE(screen.picture().pixelColor(0, 0), QColor(4, 5, 6));
}

void ScreenDisturbanceTest::silentServerHoldsNobodyUp()
{
    const Server server("");
    Screen screen;
    screen.open(server.server.fullServerName());
    QTRY_COMPARE_WITH_TIMEOUT(server.clients, 1, limit);
    QVERIFY(!screen.isConnected());
    QVERIFY(!screen.press("F5"));
}

void ScreenDisturbanceTest::serverThatHangsUpIsTriedAgain_data()
{
    QTest::addColumn<QByteArray>("bytes");
    QTest::addRow("at once") << QByteArray();
    QTest::addRow("another protocol") << QByteArray("HTTP/1.1 400 Bad Request\r\n\r\n");
    QTest::addRow("noise") << QByteArray(5000, '\xa5');
    QTest::addRow("in the greeting") << greeting().chopped(10);
    QTest::addRow("no security that we know") << QByteArray("RFB 003.008\n\x01\x63");
    QTest::addRow("security refused") << QByteArray("RFB 003.008\n") + QByteArray::fromHex("0101") +
                                             bigEndian(quint32(1)) + bigEndian(quint32(2)) + "no";
    QTest::addRow("immense screen") << greeting(65535, 65535);
    QTest::addRow("after the greeting") << greeting();
    QTest::addRow("unknown message") << greeting() + QByteArray(1, '\x7f');
    QTest::addRow("rectangle outside the screen") << greeting() +
                                                         QByteArray::fromHex("00000001"
                                                                             "00ff00ff"
                                                                             "00ff00ff"
                                                                             "00000000") +
                                                         QByteArray(300'000, 'x');
    QTest::addRow("unknown encoding") << greeting() +
                                             QByteArray::fromHex("00000001"
                                                                 "00000000"
                                                                 "00010001"
                                                                 "00000099") +
                                             QByteArray(100, 'x');
    QTest::addRow("in an update") << greeting() + update(qRgb(1, 2, 3)).chopped(5);
}

void ScreenDisturbanceTest::serverThatHangsUpIsTriedAgain()
{
    QFETCH(const QByteArray, bytes);
    const Server server(bytes);
    QObject::connect(&server.server, &QLocalServer::newConnection, &server.server, [&] {
        // Once what was written is on its way.
        server.client->disconnectFromServer();
    });
    Screen screen;
    screen.open(server.server.fullServerName());
    QTRY_VERIFY_WITH_TIMEOUT(server.clients >= 3, limit);
    QVERIFY(screen.picture().isNull());
}

QTEST_GUILESS_MAIN(ScreenDisturbanceTest)
#include "ScreenDisturbanceTest.moc"
