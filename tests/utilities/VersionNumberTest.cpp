// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/VersionNumber.h"

#include <QDataStream>
#include <QTest>

#include <atomic>
#include <thread>
#include <vector>

using Utilities::VersionNumber;

namespace
{

QByteArray bytesOf(const VersionNumber& version)
{
    QByteArray bytes;
    QDataStream stream(&bytes, QIODevice::WriteOnly);
    stream << version;
    return bytes;
}

} // namespace

class VersionNumberTest : public QObject
{
    Q_OBJECT

signals:
    void versionReported(Utilities::VersionNumber version);

private slots:
    void defaultIsAnInvalidZeroThatEqualsAValidZero();
    void builtFromTwoNumbersIsValid();
    void copiesAndAssignmentsShareTheValue();
    void assigningAValueToItselfKeepsIt();
    void bcdHasTwoDigitsAPart_data();
    void bcdHasTwoDigitsAPart();
    void bcdRefusesPartsAbove99();
    void bcdRoundTripIsExactForEveryVersionThatHasOne();
    void bcdWithADigitAboveNineIsRefused_data();
    void bcdWithADigitAboveNineIsRefused();
    void sixteenBitFormHoldsMajorInTheHighByte();
    void everySixteenBitValueIsValidAndComesBack();
    void byteArrayIsMajorThenMinor();
    void byteArrayOfAnotherLengthIsRefused();
    void textHasNoLeadingZerosAndNoValidity();
    void comparisonsLookAtTheNumbersAlone_data();
    void comparisonsLookAtTheNumbersAlone();
    void streamHoldsTheSixteenBitFormInItsByteOrder();
    void streamReadIsAlwaysValid();
    void metaTypeIsKnownByItsName();
    void metaTypeMakesDefaultsAndCopies();
    void travelsInAQueuedSignal();
    void copiesMayLiveInManyThreads();
};

void VersionNumberTest::defaultIsAnInvalidZeroThatEqualsAValidZero()
{
    const VersionNumber version;
    QVERIFY(!version.isValid());
    QCOMPARE(version.toUint16(), quint16(0));
    QCOMPARE(version.toBcd(), quint16(0xFFFF));
    QCOMPARE(QString(version), "0.0");
    QCOMPARE(version.toByteArray(), QByteArray(2, '\0'));
    QVERIFY(version == VersionNumber(0, 0));
}

void VersionNumberTest::builtFromTwoNumbersIsValid()
{
    const VersionNumber version(3, 7);
    QVERIFY(version.isValid());
    QCOMPARE(version.major(), uchar(3));
    QCOMPARE(version.minor(), uchar(7));
    QVERIFY(VersionNumber(0, 0).isValid());
    QVERIFY(VersionNumber(255, 255).isValid());
}

void VersionNumberTest::copiesAndAssignmentsShareTheValue()
{
    VersionNumber target(9, 9);
    {
        const VersionNumber source(1, 2);
        const VersionNumber copy(source); // NOLINT(performance-unnecessary-copy-initialization)
        target = copy;
    }
    QVERIFY(target.isValid());
    QCOMPARE(target.toUint16(), quint16(0x0102));
    target = VersionNumber();
    QVERIFY(!target.isValid());
}

void VersionNumberTest::assigningAValueToItselfKeepsIt()
{
    VersionNumber version(4, 5);
    const VersionNumber& same = version;
    version = same;
    QVERIFY(version.isValid());
    QCOMPARE(version.toUint16(), quint16(0x0405));
}

void VersionNumberTest::bcdHasTwoDigitsAPart_data()
{
    QTest::addColumn<int>("major");
    QTest::addColumn<int>("minor");
    QTest::addColumn<int>("bcd");
    QTest::addRow("0.0") << 0 << 0 << 0x0000;
    QTest::addRow("1.23") << 1 << 23 << 0x0123;
    QTest::addRow("12.5") << 12 << 5 << 0x1205;
    QTest::addRow("99.99") << 99 << 99 << 0x9999;
}

void VersionNumberTest::bcdHasTwoDigitsAPart()
{
    QFETCH(const int, major);
    QFETCH(const int, minor);
    QFETCH(const int, bcd);
    const VersionNumber version(static_cast<uchar>(major), static_cast<uchar>(minor));
    QCOMPARE(int(version.toBcd()), bcd);
}

void VersionNumberTest::bcdRefusesPartsAbove99()
{
    QCOMPARE(VersionNumber(100, 0).toBcd(), quint16(0xFFFF));
    QCOMPARE(VersionNumber(0, 100).toBcd(), quint16(0xFFFF));
}

void VersionNumberTest::bcdRoundTripIsExactForEveryVersionThatHasOne()
{
    for (int value = 0; value <= 0xFFFF; ++value) {
        const auto version = VersionNumber::fromUint16(static_cast<quint16>(value));
        const auto bcd = version.toBcd();
        if (version.major() > 99 || version.minor() > 99) {
            QCOMPARE(bcd, VersionNumber::noBcd);
            continue;
        }
        QVERIFY(VersionNumber::fromBcd(bcd).isValid());
        QCOMPARE(VersionNumber::fromBcd(bcd).toUint16(), version.toUint16());
    }
}

void VersionNumberTest::bcdWithADigitAboveNineIsRefused_data()
{
    QTest::addColumn<int>("bcd");
    QTest::addRow("units of minor") << 0x012A;
    QTest::addRow("tens of minor") << 0x01A2;
    QTest::addRow("units of major") << 0x0A12;
    QTest::addRow("tens of major") << 0xA000;
    QTest::addRow("no version") << 0xFFFF;
}

void VersionNumberTest::bcdWithADigitAboveNineIsRefused()
{
    QFETCH(const int, bcd);
    const auto version = VersionNumber::fromBcd(static_cast<quint16>(bcd));
    QVERIFY(!version.isValid());
    QCOMPARE(version.toUint16(), quint16(0));
}

void VersionNumberTest::sixteenBitFormHoldsMajorInTheHighByte()
{
    QCOMPARE(VersionNumber(0x12, 0x34).toUint16(), quint16(0x1234));
    const auto version = VersionNumber::fromUint16(0x0102);
    QCOMPARE(version.major(), uchar(1));
    QCOMPARE(version.minor(), uchar(2));
}

void VersionNumberTest::everySixteenBitValueIsValidAndComesBack()
{
    for (int value = 0; value <= 0xFFFF; ++value) {
        const auto version = VersionNumber::fromUint16(static_cast<quint16>(value));
        QVERIFY(version.isValid());
        QCOMPARE(int(version.toUint16()), value);
    }
}

void VersionNumberTest::byteArrayIsMajorThenMinor()
{
    QCOMPARE(VersionNumber(3, 7).toByteArray(), QByteArray("\x03\x07", 2));
    const auto version = VersionNumber::fromByteArray(QByteArray("\x03\x07", 2));
    QVERIFY(version.isValid());
    QCOMPARE(version.major(), uchar(3));
    QCOMPARE(version.minor(), uchar(7));
}

void VersionNumberTest::byteArrayOfAnotherLengthIsRefused()
{
    for (const int length : {0, 1, 3, 100}) {
        const auto version = VersionNumber::fromByteArray(QByteArray(length, '\x05'));
        QVERIFY(!version.isValid());
        QCOMPARE(version.toUint16(), quint16(0));
    }
}

void VersionNumberTest::textHasNoLeadingZerosAndNoValidity()
{
    QCOMPARE(QString(VersionNumber(1, 5)), "1.5");
    QCOMPARE(QString(VersionNumber(2, 10)), "2.10");
    QCOMPARE(QString(VersionNumber(255, 255)), "255.255");
}

void VersionNumberTest::comparisonsLookAtTheNumbersAlone_data()
{
    QTest::addColumn<VersionNumber>("left");
    QTest::addColumn<VersionNumber>("right");
    QTest::addColumn<int>("order");
    QTest::addRow("minor below major") << VersionNumber(1, 255) << VersionNumber(2, 0) << -1;
    QTest::addRow("equal") << VersionNumber(2, 0) << VersionNumber(2, 0) << 0;
    QTest::addRow("unsigned") << VersionNumber(255, 0) << VersionNumber(1, 0) << 1;
    QTest::addRow("invalid equals zero") << VersionNumber() << VersionNumber(0, 0) << 0;
    QTest::addRow("invalid is below") << VersionNumber() << VersionNumber(0, 1) << -1;
}

void VersionNumberTest::comparisonsLookAtTheNumbersAlone()
{
    QFETCH(const VersionNumber, left);
    QFETCH(const VersionNumber, right);
    QFETCH(const int, order);
    QCOMPARE(left == right, order == 0);
    QCOMPARE(left != right, order != 0);
    QCOMPARE(left > right, order > 0);
    QCOMPARE(left >= right, order >= 0);
    QCOMPARE(left <= right, order <= 0);
    QCOMPARE(left < right, order < 0);
}

void VersionNumberTest::streamHoldsTheSixteenBitFormInItsByteOrder()
{
    QCOMPARE(bytesOf(VersionNumber(1, 2)), QByteArray("\x01\x02", 2));
    QByteArray bytes;
    QDataStream stream(&bytes, QIODevice::WriteOnly);
    stream.setByteOrder(QDataStream::LittleEndian);
    stream << VersionNumber(1, 2);
    QCOMPARE(bytes, QByteArray("\x02\x01", 2));
}

void VersionNumberTest::streamReadIsAlwaysValid()
{
    for (const auto& written : {VersionNumber(1, 2), VersionNumber()}) {
        QDataStream stream(bytesOf(written));
        VersionNumber read;
        stream >> read;
        QVERIFY(read.isValid());
        QCOMPARE(read.toUint16(), written.toUint16());
    }
}

void VersionNumberTest::metaTypeIsKnownByItsName()
{
    QVERIFY(QMetaType::fromName("Utilities::VersionNumber") == QMetaType::fromType<VersionNumber>());
}

void VersionNumberTest::metaTypeMakesDefaultsAndCopies()
{
    const auto type = QMetaType::fromName("Utilities::VersionNumber");
    auto* const made = static_cast<VersionNumber*>(type.create());
    QVERIFY(!made->isValid());
    type.destroy(made);
    const VersionNumber original(6, 1);
    auto* const copy = static_cast<VersionNumber*>(type.create(&original));
    QCOMPARE(copy->toUint16(), quint16(0x0601));
    type.destroy(copy);
}

void VersionNumberTest::travelsInAQueuedSignal()
{
    VersionNumber received;
    QObject receiver;
    connect(
        this, &VersionNumberTest::versionReported, &receiver, [&](const VersionNumber& version) { received = version; },
        Qt::QueuedConnection);
    emit versionReported(VersionNumber(8, 15));
    QVERIFY(!received.isValid());
    QTRY_VERIFY(received.isValid());
    QCOMPARE(QString(received), "8.15");
}

void VersionNumberTest::copiesMayLiveInManyThreads()
{
    const VersionNumber original(7, 9);
    std::atomic<int> wrong = 0;
    std::vector<std::thread> threads;
    for (int index = 0; index < 4; ++index)
        threads.emplace_back([copy = original, &wrong] {
            VersionNumber local;
            for (int round = 0; round < 2000; ++round) {
                local = copy;
                const VersionNumber another(local); // NOLINT(performance-unnecessary-copy-initialization)
                wrong += another.toUint16() != 0x0709;
                local = VersionNumber();
            }
        });
    for (auto& thread : threads)
        thread.join();
    QCOMPARE(wrong.load(), 0);
}

QTEST_GUILESS_MAIN(VersionNumberTest)
#include "VersionNumberTest.moc"
