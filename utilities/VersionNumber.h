// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QExplicitlySharedDataPointer>
#include <QMetaType>
#include <QString>

// Some C libraries define these as macros for the parts of a device number.
#undef major
#undef minor

class QDataStream;

namespace Utilities
{

/// The firmware version of a peripheral processor: major.minor, a byte each, and whether it comes from real data.
///
/// An immutable, implicitly shared value: every operation may be called from any thread, and copies of one value may
/// live in different threads. It travels in queued signals as the meta-type "Utilities::VersionNumber", which is
/// registered before `main` runs.
///
/// Forms (an invalid value is 0.0 in all of them but BCD):
///
/// | Form   | Layout                                                              | Refused, giving the invalid 0.0  |
/// |--------|---------------------------------------------------------------------|----------------------------------|
/// | uint16 | major * 256 + minor                                                 | nothing                          |
/// | BCD    | four digits, tens and units of major, then of minor: 12.5 is 0x1205 | any digit above 9                |
/// | bytes  | major, minor                                                        | any length but 2                 |
/// | stream | uint16 in the stream's byte order                                   | nothing                          |
/// | text   | "major.minor" in decimal, without leading zeros                     | (not read)                       |
class VersionNumber
{
public:
    /// What `toBcd` gives for a version that has no BCD form: an invalid one, or a part above 99.
    static constexpr quint16 noBcd = 0xFFFF;

    VersionNumber();
    VersionNumber(unsigned char major, unsigned char minor);
    VersionNumber(const VersionNumber& other);
    VersionNumber& operator=(const VersionNumber& other);
    ~VersionNumber();

    [[nodiscard]] bool isValid() const;
    [[nodiscard]] unsigned char major() const;
    [[nodiscard]] unsigned char minor() const;

    [[nodiscard]] quint16 toUint16() const;
    [[nodiscard]] quint16 toBcd() const;
    [[nodiscard]] QByteArray toByteArray() const;
    operator QString() const; // NOLINT(google-explicit-constructor): shown in labels and messages as it is

    [[nodiscard]] static VersionNumber fromUint16(unsigned short value);
    [[nodiscard]] static VersionNumber fromBcd(unsigned short bcd);
    [[nodiscard]] static VersionNumber fromByteArray(const QByteArray& bytes);

    /// Comparisons look at the numbers alone: an invalid value equals a valid 0.0.
    bool operator==(const VersionNumber& other) const;
    bool operator!=(const VersionNumber& other) const;
    bool operator>(const VersionNumber& other) const;
    bool operator>=(const VersionNumber& other) const;
    bool operator<=(const VersionNumber& other) const;
    bool operator<(const VersionNumber& other) const;

private:
    class PrivateData;

    QExplicitlySharedDataPointer<PrivateData> data;
};

QDataStream& operator<<(QDataStream& stream, const VersionNumber& version);
QDataStream& operator>>(QDataStream& stream, VersionNumber& version);

} // namespace Utilities

Q_DECLARE_METATYPE(Utilities::VersionNumber)
