// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/ControlDescription.h"
#include "virtual-device/control/CtlParser.h"

#include <QDir>
#include <QFile>
#include <QProcess>
#include <QRegularExpression>
#include <QTest>

using namespace VirtualDevice;

namespace
{

QString contents(const QString& name)
{
    QFile file(QStringLiteral(SOURCE_FOLDER "/") + name);
    return file.open(QIODevice::ReadOnly) ? QString::fromUtf8(file.readAll()) : QString();
}

} // namespace

/// What is written about the virtual device agrees with what it does.
class DocumentationTest : public QObject
{
    Q_OBJECT

private slots:
    void controlsPageIsTheControlTable();
    void manualIsWellFormed_data();
    void manualIsWellFormed();
    void manualNamesEveryRequestAndOption();
};

void DocumentationTest::controlsPageIsTheControlTable()
{
    QVERIFY2(contents("docs/controls.md") == ControlDescription::markdown(),
             "the control table has changed: build the target \"controls-page\" and commit docs/controls.md");
}

void DocumentationTest::manualIsWellFormed_data()
{
    QTest::addColumn<QString>("page");
    const QDir folder(SOURCE_FOLDER "/docs/man");
    const auto pages = folder.entryList(QDir::Files);
    QVERIFY(pages.contains("virtual-device.1") && pages.contains("immunityrig.1"));
    for (const auto& page : pages)
        QTest::addRow("%s", qPrintable(page)) << folder.filePath(page);
}

void DocumentationTest::manualIsWellFormed()
{
    QFETCH(const QString, page);
    QProcess mandoc;
    mandoc.start("mandoc", {"-T", "lint", "-W", "warning", page});
    QVERIFY(mandoc.waitForFinished());
    QCOMPARE(QString::fromUtf8(mandoc.readAllStandardOutput()), QString());
    QCOMPARE(mandoc.exitCode(), 0);
}

void DocumentationTest::manualNamesEveryRequestAndOption()
{
    const QString manual = contents("docs/man/virtual-device.1");
    const QString usage = parseCtl({"--help"}).help;
    static const QRegularExpression request("^  ([a-z]+)( region| control| log)? ",
                                            QRegularExpression::MultilineOption);
    static const QRegularExpression option("--([a-z]+)");
    int requests = 0;
    for (const auto& match : request.globalMatch(usage)) {
        const QString second = match.captured(2).trimmed();
        const QString entry = ".It Cm " + match.captured(1) + (second.isEmpty() ? QString() : " Cm " + second);
        QVERIFY2(manual.contains(entry), qPrintable(entry));
        ++requests;
    }
    QCOMPARE(requests, 13);
    for (const auto& match : option.globalMatch(usage))
        QVERIFY2(manual.contains("Fl -" + match.captured(1)), qPrintable(match.captured()));
}

QTEST_GUILESS_MAIN(DocumentationTest)
#include "DocumentationTest.moc"
