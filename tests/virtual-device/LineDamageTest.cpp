// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/LineDamage.h"

#include <QTest>

using namespace VirtualDevice;
using Rates = LineDamage::Rates;

namespace
{

constexpr int always = 100'000;

QByteArray counting(int size)
{
    QByteArray bytes(size, Qt::Uninitialized);
    for (int index = 0; index < size; ++index)
        bytes[index] = static_cast<char>(index);
    return bytes;
}

int differences(const QByteArray& left, const QByteArray& right)
{
    int count = 0;
    for (qsizetype index = 0; index < std::min(left.size(), right.size()); ++index)
        count += left[index] != right[index] ? 1 : 0;
    return count;
}

} // namespace

class LineDamageTest : public QObject
{
    Q_OBJECT

private slots:
    void aCleanLineChangesNothing() { QCOMPARE(LineDamage(3).applied(counting(1000), {}), counting(1000)); }

    void eachFaultAtFullRateStrikesEveryByte()
    {
        LineDamage damage(3);
        QCOMPARE(damage.applied(counting(300), {.drop = always}), QByteArray());
        QCOMPARE(damage.applied("ab", {.duplicate = always}), QByteArray("aabb"));
        const QByteArray inserted = damage.applied("ab", {.insert = always});
        QCOMPARE(inserted.size(), 4);
        QCOMPARE(inserted[1], 'a');
        QCOMPARE(inserted[3], 'b');
        const QByteArray flipped = damage.applied(counting(256), {.flip = always});
        QCOMPARE(flipped.size(), 256);
        for (int index = 0; index < 256; ++index)
            QCOMPARE(qPopulationCount(static_cast<quint8>(flipped[index] ^ static_cast<char>(index))), 1U);
    }

    void ratesCountPerHundredThousandBytes()
    {
        const int size = 200'000;
        const int flips = differences(LineDamage(5).applied(counting(size), {.flip = 1000}), counting(size));
        QVERIFY2(flips > 1700 && flips < 2300, qPrintable(QString::number(flips)));
        const auto dropped = size - LineDamage(5).applied(counting(size), {.drop = 1000}).size();
        QVERIFY2(dropped > 1700 && dropped < 2300, qPrintable(QString::number(dropped)));
        const auto inserted = LineDamage(5).applied(counting(size), {.insert = 1000}).size() - size;
        QVERIFY2(inserted > 1700 && inserted < 2300, qPrintable(QString::number(inserted)));
        const auto doubled = LineDamage(5).applied(counting(size), {.duplicate = 1000}).size() - size;
        QVERIFY2(doubled > 1700 && doubled < 2300, qPrintable(QString::number(doubled)));
    }

    void theSameSeedDoesTheSameDamageHoweverTheBytesAreCut()
    {
        const Rates rates{.drop = 2000, .insert = 2000, .flip = 2000, .duplicate = 2000};
        const QByteArray whole = LineDamage(42).applied(counting(5000), rates);
        LineDamage cut(42);
        QByteArray pieces;
        for (int at = 0; at < 5000; at += 7) {
            pieces += cut.applied(counting(5000).mid(at, 7), rates);
            (void)cut.noise(3); // a burst in between leaves the damage alone
            (void)cut.piece(3);
        }
        QCOMPARE(pieces, whole);
        QVERIFY(LineDamage(43).applied(counting(5000), rates) != whole);
        cut.setSeed(42);
        QCOMPARE(cut.applied(counting(5000), rates), whole);
    }

    void theFirstBytesOfASeedAreFixedForEver()
    {
        QCOMPARE(LineDamage(1).noise(8).toHex(), QByteArray("366eefeddcd28d59"));
    }
};

QTEST_GUILESS_MAIN(LineDamageTest)
#include "LineDamageTest.moc"
