// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/VersionNumber.h"

#include <QDataStream>
#include <QIODevice>
#include <QSharedData>

namespace Utilities
{

class VersionNumber::PrivateData : public QSharedData
{
public:
    PrivateData() = default;
    PrivateData(unsigned char majorPart, unsigned char minorPart) : major(majorPart), minor(minorPart), valid(true) {}

    const unsigned char major = 0;
    const unsigned char minor = 0;
    const bool valid = false;
};

namespace
{

constexpr int bitsOfDigit = 4;
constexpr int largestTwoDigitNumber = 99;

constexpr unsigned digitAt(unsigned bcd, int position)
{
    return (bcd >> (position * bitsOfDigit)) & 0xFU;
}

constexpr unsigned twoDigits(unsigned number)
{
    return (number / 10) << bitsOfDigit | number % 10;
}

} // namespace

VersionNumber::VersionNumber() : data(new PrivateData) {}

VersionNumber::VersionNumber(unsigned char major, unsigned char minor) : data(new PrivateData(major, minor)) {}

VersionNumber::VersionNumber(const VersionNumber& other) = default;
VersionNumber& VersionNumber::operator=(const VersionNumber& other) = default;
VersionNumber::~VersionNumber() = default;

bool VersionNumber::isValid() const
{
    return data->valid;
}

unsigned char VersionNumber::major() const
{
    return data->major;
}

unsigned char VersionNumber::minor() const
{
    return data->minor;
}

quint16 VersionNumber::toUint16() const
{
    return static_cast<quint16>(data->major << 8 | data->minor);
}

quint16 VersionNumber::toBcd() const
{
    if (!data->valid || data->major > largestTwoDigitNumber || data->minor > largestTwoDigitNumber)
        return noBcd;
    return static_cast<quint16>(twoDigits(data->major) << 8 | twoDigits(data->minor));
}

QByteArray VersionNumber::toByteArray() const
{
    QByteArray bytes;
    QDataStream stream(&bytes, QIODevice::WriteOnly);
    stream << quint8(data->major) << quint8(data->minor);
    return bytes;
}

VersionNumber::operator QString() const
{
    return QStringLiteral("%1.%2").arg(uint(data->major)).arg(uint(data->minor));
}

VersionNumber VersionNumber::fromUint16(unsigned short value)
{
    return {static_cast<unsigned char>(value >> 8), static_cast<unsigned char>(value & 0xFF)};
}

VersionNumber VersionNumber::fromBcd(unsigned short bcd)
{
    for (int position = 0; position < 4; ++position) {
        if (digitAt(bcd, position) > 9)
            return {};
    }
    return {static_cast<unsigned char>(digitAt(bcd, 3) * 10 + digitAt(bcd, 2)),
            static_cast<unsigned char>(digitAt(bcd, 1) * 10 + digitAt(bcd, 0))};
}

VersionNumber VersionNumber::fromByteArray(const QByteArray& bytes)
{
    if (bytes.size() != 2)
        return {};
    QDataStream stream(bytes);
    quint8 major = 0;
    quint8 minor = 0;
    stream >> major >> minor;
    return {major, minor};
}

bool VersionNumber::operator==(const VersionNumber& other) const
{
    return toUint16() == other.toUint16();
}

bool VersionNumber::operator!=(const VersionNumber& other) const
{
    return !(*this == other);
}

bool VersionNumber::operator>(const VersionNumber& other) const
{
    return toUint16() > other.toUint16();
}

bool VersionNumber::operator>=(const VersionNumber& other) const
{
    return *this == other || *this > other;
}

bool VersionNumber::operator<=(const VersionNumber& other) const
{
    return !(*this > other);
}

bool VersionNumber::operator<(const VersionNumber& other) const
{
    return !(*this >= other);
}

QDataStream& operator<<(QDataStream& stream, const VersionNumber& version)
{
    return stream << version.toUint16();
}

QDataStream& operator>>(QDataStream& stream, VersionNumber& version)
{
    quint16 value = 0;
    stream >> value;
    version = VersionNumber::fromUint16(value);
    return stream;
}

} // namespace Utilities

// The library's link interface asks for this symbol: without it the linker leaves this file out of a program that
// knows the type by its name only, and the registration with it.
extern "C" const int immunityrigVersionNumberMetaType;
const int immunityrigVersionNumberMetaType = qRegisterMetaType<Utilities::VersionNumber>("Utilities::VersionNumber");
