// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/log/LogStore.h"

#include <QFileInfo>
#include <QSignalSpy>
#include <QTemporaryDir>
#include <QTest>
#include <QTimer>

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

using VirtualDevice::LogLine;
using VirtualDevice::LogStore;

namespace
{

/// A program's end of the log connection.
class Sender
{
public:
    explicit Sender(const QString& path) : descriptor(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0))
    {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        qstrncpy(address.sun_path, qPrintable(path), sizeof address.sun_path);
        isConnected = ::connect(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
    }
    ~Sender() { ::close(descriptor); }
    Sender(const Sender&) = delete;
    Sender& operator=(const Sender&) = delete;

    /// False when the service's queue is full or nobody serves.
    bool send(const QByteArray& datagram) const
    {
        const auto length = ::send(descriptor, datagram.constData(), static_cast<std::size_t>(datagram.size()),
                                   MSG_DONTWAIT | MSG_NOSIGNAL);
        return length == datagram.size();
    }

    bool isConnected = false;

private:
    int descriptor;
};

} // namespace

class LogStoreTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void codeGivesPriorityAndFacility_data();
    void codeGivesPriorityAndFacility();
    void identityAndTextFollowTheTimeStamp();
    void identityLosesItsProcessNumber();
    void textKeepsColonsPercentSignsAndHighCharacters();
    void trailingLineEndAndNullAreNoPartOfTheText();
    void datagramWithoutCodeIsKeptWholeAsUserNotice();
    void codeBeyondTheLastFacilityIsText();
    void timeStampMayBeMissing();
    void linesArriveNumberedInOrder();
    void linesAfterAMarkAreTheLaterOnes();
    void onlyTheNewestLinesAreKept();
    void socketIsForItsOwnerAlone();
    void stalledServiceLetsItsQueueFillAndCatchesUpLater();
    void stallBeforeOpeningHolds();
    void openReplacesASocketThatWasLeft();
    void programThatLogsWithoutEndLeavesTheThreadToOthers();
    void giantLinesAreKeptUpToALimit();
    void closeRemovesTheSocketAndKeepsTheLines();
    void pathThatIsTooLongForASocketIsRefused();

private:
    QTemporaryDir folder;
    QString path;
};

void LogStoreTest::init()
{
    path = folder.filePath("log");
}

void LogStoreTest::codeGivesPriorityAndFacility_data()
{
    QTest::addColumn<QByteArray>("code");
    QTest::addColumn<int>("priority");
    QTest::addColumn<int>("facility");
    QTest::addRow("user warning") << QByteArray("<12>") << 4 << 1;
    QTest::addRow("user emergency") << QByteArray("<8>") << 0 << 1;
    QTest::addRow("user debug") << QByteArray("<15>") << 7 << 1;
    QTest::addRow("kernel warning") << QByteArray("<4>") << 4 << 0;
    QTest::addRow("last facility") << QByteArray("<191>") << 7 << 23;
}

void LogStoreTest::codeGivesPriorityAndFacility()
{
    QFETCH(const QByteArray, code);
    const LogLine line = LogStore::parsed(code + "Nov 21 00:00:01 VQK: text");
    QTEST(line.priority, "priority");
    QTEST(line.facility, "facility");
    QCOMPARE(line.identity, "VQK");
    QCOMPARE(line.text, "text");
}

void LogStoreTest::identityAndTextFollowTheTimeStamp()
{
    const LogLine line = LogStore::parsed("<12>Nov  1 23:59:59 VQK: utilities/Debug.cpp, 7, text");
    QCOMPARE(line.identity, "VQK");
    QCOMPARE(line.text, "utilities/Debug.cpp, 7, text");
}

void LogStoreTest::identityLosesItsProcessNumber()
{
    const LogLine line = LogStore::parsed("<13>Nov 21 00:00:01 logger[42]: text");
    QCOMPARE(line.identity, "logger");
    QCOMPARE(line.text, "text");
}

void LogStoreTest::textKeepsColonsPercentSignsAndHighCharacters()
{
    const LogLine line = LogStore::parsed("<12>Nov 21 00:00:01 VQK: a: b %n%s \xE9\nc");
    QCOMPARE(line.text, QStringLiteral("a: b %n%s \u00e9\nc"));
}

void LogStoreTest::trailingLineEndAndNullAreNoPartOfTheText()
{
    QCOMPARE(LogStore::parsed(QByteArray("<12>Nov 21 00:00:01 VQK: text\n\0", 31)).text, "text");
}

void LogStoreTest::datagramWithoutCodeIsKeptWholeAsUserNotice()
{
    const LogLine line = LogStore::parsed("no code at all");
    QCOMPARE(line.priority, 5);
    QCOMPARE(line.facility, 1);
    QCOMPARE(line.identity, QString());
    QCOMPARE(line.text, "no code at all");
}

void LogStoreTest::codeBeyondTheLastFacilityIsText()
{
    const LogLine line = LogStore::parsed("<192>text");
    QCOMPARE(line.priority, 5);
    QCOMPARE(line.text, "<192>text");
}

void LogStoreTest::timeStampMayBeMissing()
{
    const LogLine line = LogStore::parsed("<12>VQK: text");
    QCOMPARE(line.identity, "VQK");
    QCOMPARE(line.text, "text");
}

void LogStoreTest::linesArriveNumberedInOrder()
{
    LogStore store;
    QCOMPARE(store.open(path), std::nullopt);
    QSignalSpy spy(&store, &LogStore::lineReceived);
    const Sender sender(path);
    const QDateTime before = QDateTime::currentDateTimeUtc();
    QVERIFY(sender.send("<12>Nov 21 00:00:01 VQK: one"));
    QVERIFY(sender.send("<14>Nov 21 00:00:01 VQK: two"));
    QTRY_COMPARE_WITH_TIMEOUT(spy.count(), 2, 20000);
    const auto first = spy.at(0).at(0).value<LogLine>();
    const auto second = spy.at(1).at(0).value<LogLine>();
    QCOMPARE(first.number, 1);
    QCOMPARE(first.text, "one");
    QCOMPARE(second.number, 2);
    QCOMPARE(second.text, "two");
    QVERIFY(first.received >= before && first.received <= second.received);
    QCOMPARE(store.lines().size(), 2);
}

void LogStoreTest::linesAfterAMarkAreTheLaterOnes()
{
    LogStore store;
    QCOMPARE(store.open(path), std::nullopt);
    const Sender sender(path);
    for (const char* text : {"<12>VQK: one", "<12>VQK: two", "<12>VQK: three"})
        QVERIFY(sender.send(text));
    QTRY_COMPARE_WITH_TIMEOUT(store.lines().size(), 3, 20000);
    QCOMPARE(store.linesAfter(0).size(), 3);
    QCOMPARE(store.linesAfter(2).size(), 1);
    QCOMPARE(store.linesAfter(2).front().text, "three");
    QVERIFY(store.linesAfter(3).isEmpty());
}

void LogStoreTest::onlyTheNewestLinesAreKept()
{
    constexpr int extra = 5;
    constexpr int total = static_cast<int>(LogStore::capacity) + extra;
    LogStore store;
    QCOMPARE(store.open(path), std::nullopt);
    const Sender sender(path);
    for (int number = 0; number < total; ++number) {
        while (!sender.send("<12>VQK: " + QByteArray::number(number)))
            QCoreApplication::processEvents();
    }
    QTRY_VERIFY_WITH_TIMEOUT(!store.lines().isEmpty() && store.lines().back().number == total, 20000);
    QCOMPARE(store.lines().size(), static_cast<qsizetype>(LogStore::capacity));
    QCOMPARE(store.lines().front().text, QString::number(extra));
}

void LogStoreTest::socketIsForItsOwnerAlone()
{
    LogStore store;
    QCOMPARE(store.open(path), std::nullopt);
    struct stat status
    {
    };
    QCOMPARE(::stat(qPrintable(path), &status), 0);
    QCOMPARE(status.st_mode & 0777, 0600U);
}

void LogStoreTest::stalledServiceLetsItsQueueFillAndCatchesUpLater()
{
    LogStore store;
    QCOMPARE(store.open(path), std::nullopt);
    store.setStalled(true);
    const Sender sender(path);
    int accepted = 0;
    while (sender.send("<12>VQK: text")) {
        ++accepted;
        QCoreApplication::processEvents();
    }
    QVERIFY(accepted > 0);
    QVERIFY(store.lines().isEmpty());
    store.setStalled(false);
    QTRY_COMPARE_WITH_TIMEOUT(store.lines().size(), accepted, 20000);
}

void LogStoreTest::stallBeforeOpeningHolds()
{
    LogStore store;
    store.setStalled(true);
    QCOMPARE(store.open(path), std::nullopt);
    const Sender sender(path);
    QVERIFY(sender.send("<12>VQK: text"));
    QCoreApplication::processEvents();
    QVERIFY(store.lines().isEmpty());
}

void LogStoreTest::openReplacesASocketThatWasLeft()
{
    QFile left(path);
    QVERIFY(left.open(QIODevice::WriteOnly));
    LogStore store;
    QCOMPARE(store.open(path), std::nullopt);
    QVERIFY(Sender(path).isConnected);
}

void LogStoreTest::programThatLogsWithoutEndLeavesTheThreadToOthers()
{
    constexpr int plenty = 20'000;
    LogStore store;
    QCOMPARE(store.open(path), std::nullopt);
    const Sender sender(path);
    int lines = 0;
    // There is always one more to read.
    connect(&store, &LogStore::lineReceived, this, [&] {
        if (++lines < plenty)
            QVERIFY(sender.send("<12>VQK: more"));
    });
    int linesBeforeOthers = 0;
    QVERIFY(sender.send("<12>VQK: first"));
    QTRY_VERIFY_WITH_TIMEOUT(lines > 0, 20000);
    QTimer::singleShot(0, this, [&] { linesBeforeOthers = lines; });
    QTRY_COMPARE_WITH_TIMEOUT(lines, plenty, 20000);
    QVERIFY(linesBeforeOthers > 0);
    QVERIFY(linesBeforeOthers < plenty);
}

void LogStoreTest::giantLinesAreKeptUpToALimit()
{
    constexpr qsizetype length = 60'000;
    constexpr int sent = LogStore::largestText / length + 20;
    LogStore store;
    QCOMPARE(store.open(path), std::nullopt);
    const Sender sender(path);
    for (int number = 1; number <= sent; ++number) {
        QVERIFY(sender.send("<12>VQK: " + QByteArray(length, 'x')));
        QTRY_VERIFY_WITH_TIMEOUT(!store.lines().isEmpty() && store.lines().last().number == number, 20000);
    }
    QCOMPARE(store.lines().size(), LogStore::largestText / length);
    QCOMPARE(store.lines().first().number, sent - LogStore::largestText / length + 1);
}

void LogStoreTest::closeRemovesTheSocketAndKeepsTheLines()
{
    LogStore store;
    QCOMPARE(store.open(path), std::nullopt);
    QVERIFY(Sender(path).send("<12>VQK: text"));
    QTRY_COMPARE_WITH_TIMEOUT(store.lines().size(), 1, 20000);
    store.close();
    QVERIFY(!QFileInfo::exists(path));
    QCOMPARE(store.lines().size(), 1);
}

void LogStoreTest::pathThatIsTooLongForASocketIsRefused()
{
    LogStore store;
    const QString longPath = folder.filePath(QString(200, 'x'));
    QCOMPARE(store.open(longPath), longPath + ": too long for a socket's path");
}

QTEST_GUILESS_MAIN(LogStoreTest)
#include "LogStoreTest.moc"
