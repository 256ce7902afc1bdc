// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/Repetition.h"

#include <QFile>
#include <QLibraryInfo>
#include <QTest>
#include <QtEndian>

namespace
{

QByteArray content(const QString& path)
{
    QFile file(path);
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray("(missing)");
}

/// A little-endian number of the header of a WAV file.
template <typename Number> Number number(const QByteArray& wav, qsizetype offset)
{
    return qFromLittleEndian<Number>(wav.constData() + offset);
}

} // namespace

/// What is compiled into the program.
class ResourcesTest : public QObject
{
    Q_OBJECT

private slots:
    void theToolkitConfigurationSetsThePrefix()
    {
        QCOMPARE(content(QStringLiteral(":/qt/etc/qt.conf")), QByteArray("[Paths]\nPrefix=/usr/share\n"));
        QCOMPARE(content(QStringLiteral(":/qt/etc/qt.conf")).size(), 26);
        QCOMPARE(QLibraryInfo::path(QLibraryInfo::PrefixPath), QStringLiteral("/usr/share"));
    }

    void theTestSoundIsMonoOf16BitsAt16Kilohertz()
    {
        const auto wav = content(QStringLiteral(":/sounds/TestSound.wav"));
        QCOMPARE(wav.left(4), QByteArray("RIFF"));
        QCOMPARE(wav.mid(8, 8), QByteArray("WAVEfmt "));
        QCOMPARE(number<quint16>(wav, 20), 1);       // PCM
        QCOMPARE(number<quint16>(wav, 22), 1);       // channels
        QCOMPARE(number<quint32>(wav, 24), 16'000U); // samples a second
        QCOMPARE(number<quint16>(wav, 34), 16);      // bits a sample
        QCOMPARE(wav.mid(36, 4), QByteArray("data"));
        const auto bytes = number<quint32>(wav, 40);
        QCOMPARE(wav.size(), 44 + qsizetype(bytes));
        QCOMPARE(bytes, 2U * 16'000U * 2U); // two seconds
    }

    void theTestSoundCanBeHeard()
    {
        const auto wav = content(QStringLiteral(":/sounds/TestSound.wav"));
        int loudest = 0;
        for (qsizetype offset = 44; offset + 1 < wav.size(); offset += 2)
            loudest = std::max(loudest, std::abs(number<qint16>(wav, offset)));
        QVERIFY(loudest > 8'000);
    }

    void noPartOfTheTestSoundIsLikeAnother()
    {
        QVERIFY(!TestSupport::hasRepeatedBuffer(content(QStringLiteral(":/sounds/TestSound.wav")).mid(44), 8192));
    }
};

QTEST_GUILESS_MAIN(ResourcesTest)
#include "ResourcesTest.moc"
