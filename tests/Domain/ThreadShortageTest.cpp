// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/ThreadShortage.h"

#include "Domain/src/DomainLayer/DspPort.h"
#include "tests/Domain/DspTestParts.h"
#include "tests/Domain/Radio.h"
#include "tests/support/LogCapture.h"

#include <QTest>
#include <QThread>

#include <memory>

using TestSupport::DspPeer;
using TestSupport::LogCapture;
using TestSupport::Radio;
using TestSupport::sourcedTexts;
using TestSupport::ThreadShortage::refusesOfQt;

/// The links on a machine that has no thread left for them. Neither may hold up the start for ever.
class ThreadShortageTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup() { log.reset(); }

    void dspPortWithoutItsReadThreadIsRefusedAndCanBeClosed();
    void beaconProcessorWithoutItsThreadRefusesCommandsAndHearsTheRadio();

private:
    std::unique_ptr<LogCapture> log;
};

void ThreadShortageTest::init()
{
    TestSupport::makeResetLine();
    TestSupport::writeFirmware();
    log = std::make_unique<LogCapture>();
}

void ThreadShortageTest::dspPortWithoutItsReadThreadIsRefusedAndCanBeClosed()
{
    const DspPeer peer;
    Domain::DspPort port(QStringLiteral("/dsp.out"));
    refusesOfQt = 1;
    QVERIFY(!port.open(QIODevice::ReadWrite));
    QCOMPARE(refusesOfQt.load(), 0);
    QCOMPARE(sourcedTexts(*log), (QStringList{"DspLink: DSP execution started successfully.",
                                              "DspPort: Previous read thread is not finished."}));
    port.close();
    QVERIFY(port.open(QIODevice::ReadWrite));
}

void ThreadShortageTest::beaconProcessorWithoutItsThreadRefusesCommandsAndHearsTheRadio()
{
    refusesOfQt = 1;
    Radio radio;
    QCOMPARE(refusesOfQt.load(), 0);
    QCOMPARE(radio.processor.thread(), QThread::currentThread());
    QVERIFY(sourcedTexts(*log).contains(
        QStringLiteral("BeaconProcessor: No thread for the radio's answers: every command is refused")));
    // Whoever waits for an accepted command does so without the event loop, in which alone the answer could be handled.
    QVERIFY(!radio.processor.sendPing());
    QVERIFY(radio.processor.isCommandPending());
    radio.says("\x03");
    QVERIFY(radio.tells({"transmitPacketComplete"}));
}

QTEST_GUILESS_MAIN(ThreadShortageTest)
#include "ThreadShortageTest.moc"
