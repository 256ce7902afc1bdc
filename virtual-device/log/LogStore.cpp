// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/log/LogStore.h"

#include "virtual-device/sandbox/UnixSocket.h"

#include <QRegularExpression>
#include <QSocketNotifier>

#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <utility>

namespace VirtualDevice
{

namespace
{

constexpr int largestCode = 23 * 8 + 7;

/// Takes "<PRI>" off the front; leaves a text without one as it is.
void takeCode(QString& rest, LogLine& line)
{
    static const QRegularExpression code(QStringLiteral("^<(\\d{1,3})>"));
    const auto match = code.match(rest);
    const int value = match.captured(1).toInt();
    if (!match.hasMatch() || value > largestCode)
        return;
    line.priority = value & 7;
    line.facility = value >> 3;
    rest.remove(0, match.capturedLength());
}

void takeTimeStamp(QString& rest)
{
    static const QRegularExpression stamp(QStringLiteral("^[A-Z][a-z]{2} [ \\d]\\d \\d\\d:\\d\\d:\\d\\d "));
    rest.remove(0, stamp.match(rest).capturedLength());
}

void takeIdentity(QString& rest, LogLine& line)
{
    static const QRegularExpression identity(QStringLiteral("^([^\\s:\\[]{1,64})(?:\\[\\d+\\])?: "));
    const auto match = identity.match(rest);
    line.identity = match.captured(1);
    rest.remove(0, match.capturedLength());
}

} // namespace

LogStore::LogStore(QObject* parent) : QObject(parent)
{
    qRegisterMetaType<LogLine>();
}

LogStore::~LogStore()
{
    close();
}

std::optional<QString> LogStore::open(const QString& path)
{
    close();
    auto socket = boundUnixSocket(path, SOCK_DGRAM);
    if (!socket.error.isEmpty())
        return socket.error;
    descriptor = socket.descriptor;
    socketPath = path;
    notifier = std::make_unique<QSocketNotifier>(descriptor, QSocketNotifier::Read);
    notifier->setEnabled(!isStalled);
    connect(notifier.get(), &QSocketNotifier::activated, this, &LogStore::receive);
    return std::nullopt;
}

void LogStore::close()
{
    if (descriptor < 0)
        return;
    // What the program sent before it ended is part of its log.
    if (!isStalled)
        receive();
    notifier.reset();
    ::close(std::exchange(descriptor, -1));
    ::unlink(socketPath.toLocal8Bit().constData());
}

void LogStore::setStalled(bool stalled)
{
    isStalled = stalled;
    if (notifier)
        notifier->setEnabled(!stalled);
}

QList<LogLine> LogStore::lines() const
{
    return {kept.begin(), kept.end()};
}

QList<LogLine> LogStore::linesAfter(qint64 number) const
{
    const auto first =
        std::find_if(kept.begin(), kept.end(), [&](const LogLine& line) { return line.number > number; });
    return {first, kept.end()};
}

LogLine LogStore::parsed(const QByteArray& datagram)
{
    LogLine line;
    QString rest = QString::fromLatin1(datagram);
    // The library's own end of a message: some send it, some do not.
    while (rest.endsWith(u'\n') || rest.endsWith(QChar(0)))
        rest.chop(1);
    takeCode(rest, line);
    takeTimeStamp(rest);
    takeIdentity(rest, line);
    line.text = rest;
    return line;
}

void LogStore::keep(const LogLine& line)
{
    kept.push_back(line);
    keptText += line.text.size();
    while (kept.size() > capacity || keptText > largestText) {
        keptText -= kept.front().text.size();
        kept.pop_front();
    }
}

void LogStore::receive()
{
    // Who logs as fast as it is read must not keep the thread from everything else; what is left is announced again.
    constexpr int mostAtOnce = 1000;
    std::array<char, 65536> buffer{};
    for (int remaining = mostAtOnce; remaining > 0; --remaining) {
        const auto length = ::recv(descriptor, buffer.data(), buffer.size(), MSG_DONTWAIT);
        if (length < 0)
            return;
        LogLine line = parsed(QByteArray(buffer.data(), length));
        line.number = ++received;
        line.received = QDateTime::currentDateTimeUtc();
        keep(line);
        emit lineReceived(line);
        // A listener may have closed or stalled the service.
        if (descriptor < 0 || isStalled)
            return;
    }
}

} // namespace VirtualDevice
