// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include <QCoreApplication>
#include <QMetaType>
#include <QTest>

namespace
{

bool knownWhenMainBegan = false;

}

/// A program that knows the type by its name only, as a receiver of a queued signal may: nothing here refers to the
/// class, so only the library itself can have registered it.
class VersionNumberRegistrationTest : public QObject
{
    Q_OBJECT

private slots:
    void aProgramThatNeverNamesTheClassKnowsTheType();
    void theTypeIsKnownBeforeMain();
};

void VersionNumberRegistrationTest::aProgramThatNeverNamesTheClassKnowsTheType()
{
    QVERIFY(QMetaType::fromName("Utilities::VersionNumber").isValid());
}

void VersionNumberRegistrationTest::theTypeIsKnownBeforeMain()
{
    QVERIFY(knownWhenMainBegan);
}

int main(int argc, char** argv)
{
    knownWhenMainBegan = QMetaType::fromName("Utilities::VersionNumber").isValid();
    const QCoreApplication application(argc, argv);
    VersionNumberRegistrationTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "VersionNumberRegistrationTest.moc"
