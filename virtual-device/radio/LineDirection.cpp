// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/LineDirection.h"

#include "virtual-device/radio/RadioProtocol.h"
#include "virtual-device/registry/Registry.h"

#include <algorithm>

namespace VirtualDevice
{

using namespace std::chrono_literals;

namespace
{

constexpr auto byteTime = std::chrono::nanoseconds(1s) / RadioProtocol::bytesPerSecond;
constexpr auto longestWait = 4ms; // a UART's FIFO is emptied about as often
constexpr auto splitWait = 1ms;
constexpr auto mergeHold = 100ms;    // long enough to gather several frames
constexpr int longestSplitPiece = 3; // cuts every frame in the middle of its header

} // namespace

LineDirection::LineDirection(Registry& controls, const QString& controlPrefix, quint32 seedSalt, QObject* parent)
    : QObject(parent), registry(controls), prefix(controlPrefix), salt(seedSalt), releaseTimer(this), burstTimer(this)
{
    connect(&releaseTimer, &ExactTimer::timeout, this, &LineDirection::release);
    connect(&burstTimer, &QTimer::timeout, this, &LineDirection::burst);
    connect(&registry, &Registry::changed, this, &LineDirection::controlChanged);
}

QString LineDirection::control(const char* suffix) const
{
    return prefix + QLatin1String(suffix);
}

LineDamage::Rates LineDirection::rates() const
{
    const auto rate = [this](const char* name) { return static_cast<int>(registry.integer(control(name))); };
    return {rate(".drop"), rate(".insert"), rate(".flip"), rate(".duplicate")};
}

void LineDirection::controlChanged(const QString& name)
{
    if (name != control(".burst") && name != control(".burst_every"))
        return;
    const auto every = registry.integer(control(".burst_every"));
    if (every > 0)
        burstTimer.start(std::chrono::milliseconds(every));
    else
        burstTimer.stop();
    if (every == 0 && registry.integer(control(".burst")) > 0) {
        burst();
        registry.publish(control(".burst"), 0);
    }
}

void LineDirection::burst()
{
    enqueue(damage.noise(static_cast<int>(registry.integer(control(".burst")))));
}

void LineDirection::send(QByteArrayView bytes)
{
    enqueue(damage.applied(bytes, rates()));
}

void LineDirection::clear()
{
    queue.clear();
    releaseTimer.stop();
}

void LineDirection::enqueue(const QByteArray& bytes)
{
    if (bytes.isEmpty())
        return;
    if (queue.isEmpty())
        lineTime = Clock::now();
    const auto taken = std::min(bytes.size(), capacity - queue.size());
    if (taken < bytes.size())
        registry.count(QStringLiteral("radio.bytes_lost"), bytes.size() - taken);
    queue.append(bytes.first(taken));
    if (!releaseTimer.isActive())
        arm();
}

/// How many bytes have passed the line by now.
qsizetype LineDirection::ripe() const
{
    return std::min<qsizetype>(queue.size(), (Clock::now() - lineTime) / byteTime);
}

void LineDirection::arm()
{
    const QString manner = registry.text(control(".delivery"));
    std::chrono::nanoseconds wait = queue.size() * byteTime - (Clock::now() - lineTime);
    if (manner == u"split")
        wait = splitWait;
    else if (manner == u"merge")
        wait = std::max<std::chrono::nanoseconds>(wait, mergeHold);
    else
        wait = std::clamp<std::chrono::nanoseconds>(wait, byteTime, longestWait);
    releaseTimer.start(wait);
}

void LineDirection::release()
{
    const bool splitting = registry.text(control(".delivery")) == u"split";
    const auto count = splitting ? std::min<qsizetype>(ripe(), damage.piece(longestSplitPiece)) : ripe();
    lineTime += count * byteTime;
    if (count > 0)
        deliver(count);
    if (!queue.isEmpty() && !releaseTimer.isActive())
        arm();
}

void LineDirection::deliver(qsizetype count)
{
    const QByteArray bytes = queue.first(count);
    queue.remove(0, count);
    emit delivered(bytes);
}

} // namespace VirtualDevice
