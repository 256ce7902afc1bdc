// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/RfTest.h"
#include "tests/presentation/RfPanel.h"

#include <QTest>

using Presentation::RfTest;
using TestSupport::Journal;
using TestSupport::Panel;
using TestSupport::restartAt;

namespace
{

const QString pass = QStringLiteral("background-color: green");
const QString fail = QStringLiteral("background-color: red");

} // namespace

/// The radio panel on a link that refuses commands, is stuck, and comes back.
class RfLinkTest : public QObject
{
    Q_OBJECT

private slots:
    /// No serial line: every command fails to go out, and the first one stays pending for ever.
    void aRefusedCommandIsNotWaitedForAndTurnsTheBeaconRed()
    {
        Panel panel;
        emit panel.beacon.pingResponse();
        panel.beacon.accepts = false;
        panel.test.start();
        QCOMPARE(panel.taken(), Journal({"amplifier on", "start 2 0"}));
        QCOMPARE(panel.style("labelBeacon"), fail);
    }

    void commandsQueuedBehindARefusedOneAreNotWaitedForEither()
    {
        Panel panel;
        panel.beacon.accepts = false;
        panel.test.start();
        panel.beacon.accepts = true;
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), Journal({"stop", "start 40 0"}));
        QCOMPARE(panel.afterCalling(&RfTest::toggleState), Journal({"stop", "amplifier off"}));
        QCOMPARE(panel.text("labelTransmitting"), QStringLiteral("| X"));
        QCOMPARE(panel.afterCalling(&RfTest::toggleState), Journal({"start 40 0", "amplifier on"}));
        QCOMPARE(panel.afterCalling(&RfTest::toggleExternalAntenna).size(), 8);
        QCOMPARE(panel.text("labelFrequencyValue"), QStringLiteral("2440 MHz"));
    }

    void aRefusedPingCountsAsWell()
    {
        Panel panel;
        emit panel.beacon.pingResponse();
        panel.beacon.accepts = false;
        panel.test.sendPing();
        QCOMPARE(panel.style("labelBeacon"), fail);
        panel.beacon.accepts = true;
        QCOMPARE(panel.afterCalling(&RfTest::toggleState), Journal({"start 2 0", "amplifier on"}));
    }

    void onceNothingIsPendingCommandsAreWaitedForAgain()
    {
        Panel panel;
        panel.beacon.accepts = false;
        panel.test.start();
        panel.beacon.accepts = true;
        panel.beacon.staysPending = false; // A stray acknowledgement frees the link.
        while (panel.beacon.isCommandPending()) {
        }
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), restartAt(40, 0));
    }

    void aPingReplyMakesThePanelWaitAgain()
    {
        Panel panel;
        panel.beacon.accepts = false;
        panel.test.start();
        panel.beacon.accepts = true;
        panel.beacon.staysPending = false;
        emit panel.beacon.pingResponse();
        QCOMPARE(panel.style("labelBeacon"), pass);
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), restartAt(40, 0));
    }

    /// The reply may have been under way when the line died.
    void aPingReplyOfALinkThatStaysStuckDoesNotStopTheWindow()
    {
        Panel panel;
        panel.beacon.accepts = false;
        panel.test.start();
        panel.beacon.accepts = true;
        QElapsedTimer sinceReply;
        sinceReply.start();
        emit panel.beacon.pingResponse();
        QCOMPARE(panel.style("labelBeacon"), pass);
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), Journal({"stop", "start 40 0"}));
        QVERIFY(sinceReply.elapsed() >= 4000);
        QCOMPARE(panel.style("labelBeacon"), fail);
        const int looksBefore = panel.beacon.looks;
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), Journal({"stop", "start 74 0"}));
        QVERIFY(panel.beacon.looks <= looksBefore + 4);
    }

    /// A command is done within the limit: from then on the link is as good as a new one.
    void aPingReplyAndADoneCommandTakeTheLimitAway()
    {
        Panel panel;
        panel.beacon.accepts = false;
        panel.test.start();
        panel.beacon.accepts = true;
        emit panel.beacon.pingResponse();
        panel.beacon.staysPending = false;
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), restartAt(40, 0));
        panel.beacon.staysPending = true;
        QElapsedTimer waiting;
        waiting.start();
        panel.beacon.onLook = [&] { panel.beacon.staysPending = waiting.elapsed() <= 4300; };
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), restartAt(74, 0));
        QCOMPARE(panel.style("labelBeacon"), pass);
    }

    void anAcceptedCommandIsWaitedForHoweverLongItTakes()
    {
        Panel panel;
        panel.beacon.staysPending = true;
        QElapsedTimer waiting;
        waiting.start();
        panel.beacon.onLook = [&] {
            if (waiting.elapsed() > 4300)
                panel.beacon.staysPending = false;
        };
        panel.test.start();
        QCOMPARE(panel.taken(), Journal({"amplifier on", "done", "start 2 0", "done"}));
    }
};

QTEST_MAIN(RfLinkTest)
#include "RfLinkTest.moc"
