// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include <QMetaType>
#include <QTest>

/// A program that knows the type by its name only, as a receiver of a queued signal may: nothing here refers to the
/// class, so only the library itself can have registered it.
class VersionNumberRegistrationTest : public QObject
{
    Q_OBJECT

private slots:
    void aProgramThatNeverNamesTheClassKnowsTheType();
};

void VersionNumberRegistrationTest::aProgramThatNeverNamesTheClassKnowsTheType()
{
    QVERIFY(QMetaType::fromName("Utilities::VersionNumber").isValid());
}

QTEST_GUILESS_MAIN(VersionNumberRegistrationTest)
#include "VersionNumberRegistrationTest.moc"
