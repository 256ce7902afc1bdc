// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/ControlBench.h"
#include "virtual-device/control/ControlClient.h"
#include "virtual-device/control/ControlSession.h"
#include "virtual-device/control/LineSplitter.h"
#include "virtual-device/registry/ControlTable.h"
#include "virtual-device/screen/RegionMap.h"

#include <QFile>
#include <QJsonArray>
#include <QJsonDocument>
#include <QLocalSocket>
#include <QRandomGenerator>
#include <QRegularExpression>
#include <QSignalSpy>
#include <QTest>
#include <QTimer>

#include <sys/stat.h>

#include <memory>
#include <thread>

using namespace VirtualDevice;
using TestSupport::ControlBench;

namespace
{

constexpr int limit = 20000;
const QString control = QStringLiteral("battery.voltage");

/// A client that speaks bytes.
class RawClient
{
public:
    explicit RawClient(const QString& path)
    {
        socket.connectToServer(path);
        socket.waitForConnected(limit);
    }

    void send(const QByteArray& bytes)
    {
        socket.write(bytes);
        socket.flush();
    }

    /// The next line; empty when none comes.
    QByteArray line()
    {
        const bool isThere = QTest::qWaitFor([this] { return socket.canReadLine(); }, limit);
        return isThere ? socket.readLine().trimmed() : QByteArray();
    }

    QJsonObject answer() { return QJsonDocument::fromJson(line()).object(); }

    QJsonObject ask(const QByteArray& bytes)
    {
        send(bytes + '\n');
        return answer();
    }

    QLocalSocket socket;
};

int errorCode(const QJsonObject& answer)
{
    return answer.value("error").toObject().value("code").toInt();
}

QString errorText(const QJsonObject& answer)
{
    return answer.value("error").toObject().value("message").toString();
}

} // namespace

class ControlServerTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();

    void socketIsForItsOwnerAlone();
    void socketThatAKilledDeviceLeftIsReplaced();
    void socketPathThatCannotBeMadeIsReported();

    void getReturnsTheValueUnderTheRequestsIdentity();
    void setChangesTheValueAndReturnsIt();
    void notificationIsCarriedOutWithoutAnAnswer();
    void listShowsEveryControlWithItsValueAndWhatItTakes();
    void regionsShowsEveryRegion();

    void malformedRequestGetsItsErrorAndChangesNothing_data();
    void malformedRequestGetsItsErrorAndChangesNothing();
    void refusalSaysWhatIsAllowed();
    void lineThatArrivesInPiecesIsOneMessage();
    void severalMessagesInOneWriteAreAnsweredInOrder();
    void overlongLineIsRefusedOnceAndTheNextOneWorks();
    void garbageIsAnsweredAndTheNextMessageWorks();
    void nothingOfAnUnfinishedLineIsCarriedOut();

    void manyClientsAreServedAtOnce();
    void clientThatVanishesInTheMiddleOfAWaitLeavesNothing();
    void subscriberThatNeverReadsIsDropped();
    void clientThatIsDroppedChangesNothingMore();
    void otherRequestsAreAnsweredDuringAWait();
    void waitsOfAClientAreLimited();
    void logReturnsTheLinesAfterAMark();
    void logRefusesAMarkThatIsNone();
    void keysAndPicturesNeedAProgram();
    void clientReportsALostConnection();
    void documentNamesEveryMethodAndParameter();

    void lineSplitterCutsAnyPieces();

private:
    [[nodiscard]] bool log(const QByteArray& text) const
    {
        return TestSupport::sendLog(bench->logPath(), "<12>Jan  1 00:00:00 VQK: " + text);
    }

    std::unique_ptr<ControlBench> bench;
    std::unique_ptr<ControlClient> client;
};

void ControlServerTest::init()
{
    bench = std::make_unique<ControlBench>();
    client = std::make_unique<ControlClient>();
    QVERIFY(!client->open(bench->socketPath()));
}

void ControlServerTest::cleanup()
{
    client.reset();
    bench.reset();
}

void ControlServerTest::socketIsForItsOwnerAlone()
{
    struct stat status
    {
    };
    QCOMPARE(::stat(qPrintable(bench->socketPath()), &status), 0);
    QCOMPARE(int(status.st_mode & 07777), 0600);
}

void ControlServerTest::socketThatAKilledDeviceLeftIsReplaced()
{
    Monitor monitor;
    ControlServer second({bench->registry, bench->log, bench->screen, bench->regions, monitor});
    QVERIFY(!second.listen(bench->socketPath()));
    ControlClient other;
    QVERIFY(!other.open(bench->socketPath()));
    QVERIFY(other.call("get", {{"name", control}}).isOk());
}

void ControlServerTest::socketPathThatCannotBeMadeIsReported()
{
    Monitor monitor;
    ControlServer second({bench->registry, bench->log, bench->screen, bench->regions, monitor});
    const auto problem = second.listen("/nowhere/control");
    QVERIFY(problem);
    QVERIFY2(problem->startsWith("cannot listen on /nowhere/control: "), qPrintable(*problem));
}

void ControlServerTest::getReturnsTheValueUnderTheRequestsIdentity()
{
    RawClient raw(bench->socketPath());
    const auto answer = raw.ask(R"({"jsonrpc":"2.0","id":"a","method":"get","params":{"name":"battery.voltage"}})");
    QCOMPARE(answer, (QJsonObject{{"jsonrpc", "2.0"}, {"id", "a"}, {"result", 4100000}}));
    QCOMPARE(raw.ask(R"({"jsonrpc":"2.0","id":null,"method":"get","params":{"name":"battery.voltage"}})").value("id"),
             QJsonValue());
}

void ControlServerTest::setChangesTheValueAndReturnsIt()
{
    const auto reply = client->call("set", {{"name", control}, {"value", -5}});
    QVERIFY2(reply.isOk(), qPrintable(reply.message));
    QCOMPARE(reply.result, QJsonValue(-5));
    QCOMPARE(bench->registry.integer(control), -5);
}

void ControlServerTest::notificationIsCarriedOutWithoutAnAnswer()
{
    RawClient raw(bench->socketPath());
    raw.send("{\"jsonrpc\":\"2.0\",\"method\":\"set\",\"params\":{\"name\":\"battery.voltage\",\"value\":7}}\n"
             "{\"jsonrpc\":\"2.0\",\"method\":\"no such\"}\n");
    const auto answer = raw.ask(R"({"jsonrpc":"2.0","id":1,"method":"get","params":{"name":"battery.voltage"}})");
    QCOMPARE(answer, (QJsonObject{{"jsonrpc", "2.0"}, {"id", 1}, {"result", 7}}));
}

void ControlServerTest::listShowsEveryControlWithItsValueAndWhatItTakes()
{
    bench->registry.publish(control, 12);
    const auto rows = client->call("list").result.toArray();
    QCOMPARE(rows.size(), qsizetype(controlTable().size()));
    const auto first = rows.first().toObject();
    QCOMPARE(first.value("name"), control);
    QCOMPARE(first.value("value"), 12);
    QCOMPARE(first.value("type"), "integer");
    QCOMPARE(first.value("unit"), "uV");
    QCOMPARE(first.value("access"), "operator");
    QCOMPARE(first.value("default"), 4100000);
    QCOMPARE(first.value("allowed"), "-2147483648..2147483647 uV");
    QCOMPARE(first.value("minimum"), -2147483648LL);
    QCOMPARE(first.value("maximum"), 2147483647);
    QVERIFY(!first.value("help").toString().isEmpty());
}

void ControlServerTest::regionsShowsEveryRegion()
{
    const auto rows = client->call("regions").result.toArray();
    QCOMPARE(rows.size(), RegionMap::names().size());
    const auto first = rows.first().toObject();
    QCOMPARE(first.value("name"), "rtc");
    QCOMPARE(first.value("colour"), "none");
    QCOMPARE(first.value("width"), 240);
}

void ControlServerTest::malformedRequestGetsItsErrorAndChangesNothing_data()
{
    QTest::addColumn<QByteArray>("line");
    QTest::addColumn<int>("code");
    QTest::addRow("empty line") << QByteArray() << -32700;
    QTest::addRow("no JSON") << QByteArray("set battery.voltage 5") << -32700;
    QTest::addRow("unfinished JSON") << QByteArray(R"({"jsonrpc":"2.0",)") << -32700;
    QTest::addRow("no UTF-8") << QByteArray("{\"jsonrpc\":\"2.0\",\"id\":1,\"method\":\"\xff\xfe\"}") << -32700;
    QTest::addRow("NUL byte") << QByteArray("{\"jsonrpc\":\0}", 12) << -32700;
    QTest::addRow("deep nesting") << QByteArray(5000, '[') << -32700;
    QTest::addRow("array") << QByteArray(R"([{"jsonrpc":"2.0","id":1,"method":"list"}])") << -32600;
    QTest::addRow("number") << QByteArray("17") << -32700;
    QTest::addRow("no version") << QByteArray(R"({"id":1,"method":"list"})") << -32600;
    QTest::addRow("old version") << QByteArray(R"({"jsonrpc":"1.0","id":1,"method":"list"})") << -32600;
    QTest::addRow("no method") << QByteArray(R"({"jsonrpc":"2.0","id":1})") << -32600;
    QTest::addRow("method is a number") << QByteArray(R"({"jsonrpc":"2.0","id":1,"method":1})") << -32600;
    QTest::addRow("id is an object") << QByteArray(R"({"jsonrpc":"2.0","id":{},"method":"list"})") << -32600;
    QTest::addRow("params by position")
        << QByteArray(R"({"jsonrpc":"2.0","id":1,"method":"set","params":["battery.voltage",5]})") << -32602;
    QTest::addRow("unknown method") << QByteArray(R"({"jsonrpc":"2.0","id":1,"method":"sett"})") << -32601;
    QTest::addRow("unknown parameter")
        << QByteArray(R"({"jsonrpc":"2.0","id":1,"method":"set","params":{"name":"battery.voltage","value":5,"x":1}})")
        << -32602;
    QTest::addRow("unknown control")
        << QByteArray(R"({"jsonrpc":"2.0","id":1,"method":"set","params":{"name":"battery","value":5}})") << -32602;
    QTest::addRow("no value") << QByteArray(
                                     R"({"jsonrpc":"2.0","id":1,"method":"set","params":{"name":"battery.voltage"}})")
                              << -32602;
    QTest::addRow("wrong type")
        << QByteArray(R"({"jsonrpc":"2.0","id":1,"method":"set","params":{"name":"battery.voltage","value":"5"}})")
        << -32602;
    QTest::addRow("fraction")
        << QByteArray(R"({"jsonrpc":"2.0","id":1,"method":"set","params":{"name":"battery.voltage","value":5.5}})")
        << -32602;
    QTest::addRow("out of range")
        << QByteArray(
               R"({"jsonrpc":"2.0","id":1,"method":"set","params":{"name":"battery.voltage","value":2147483648}})")
        << -32602;
}

void ControlServerTest::malformedRequestGetsItsErrorAndChangesNothing()
{
    QFETCH(const QByteArray, line);
    QSignalSpy changes(&bench->registry, &Registry::changed);
    RawClient raw(bench->socketPath());
    const auto answer = raw.ask(line);
    QTEST(errorCode(answer), "code");
    QVERIFY(!errorText(answer).isEmpty());
    QCOMPARE(answer.value("jsonrpc"), "2.0");
    QVERIFY(answer.contains("id"));
    QCOMPARE(bench->registry.integer(control), 4100000);
    QCOMPARE(changes.count(), 0);
    QVERIFY(raw.ask(R"({"jsonrpc":"2.0","id":2,"method":"list"})").contains("result"));
}

void ControlServerTest::refusalSaysWhatIsAllowed()
{
    QCOMPARE(client->call("set", {{"name", control}, {"value", 1e12}}).message,
             "control \"battery.voltage\" takes -2147483648..2147483647 uV");
    const auto unknown = client->call("get", {{"name", "batery"}}).message;
    QVERIFY2(unknown.startsWith("unknown control \"batery\"; controls: battery.voltage, battery.current"),
             qPrintable(unknown));
    QCOMPARE(client->call("gett").message,
             "unknown method \"gett\"; methods: list, get, set, press, release, hold, screenshot, regions, log, wait, "
             "events");
    QCOMPARE(client->call("get", {{"nam", control}}).message, "unknown parameter \"nam\"; allowed: name");
    QCOMPARE(client->call("list", {{"all", true}}).message, "unknown parameter \"all\"; allowed: none");
    const auto key = client->call("press", {{"key", "F99"}}).message;
    QVERIFY2(key.startsWith("unknown key \"F99\"; keys: Return|Enter|Sel, Up, Down, "), qPrintable(key));
    QCOMPARE(client->call("hold", {{"key", "F5"}, {"milliseconds", 0}}).message, "\"milliseconds\" takes 1..600000");
}

void ControlServerTest::lineThatArrivesInPiecesIsOneMessage()
{
    RawClient raw(bench->socketPath());
    const QByteArray line = R"({"jsonrpc":"2.0","id":1,"method":"get","params":{"name":"battery.voltage"}})";
    for (const char byte : line) {
        raw.send(QByteArray(1, byte));
        QCoreApplication::processEvents();
    }
    QCOMPARE(raw.ask("\r").value("result"), 4100000);
}

void ControlServerTest::severalMessagesInOneWriteAreAnsweredInOrder()
{
    RawClient raw(bench->socketPath());
    QByteArray all;
    for (int id = 0; id < 50; ++id)
        all += R"({"jsonrpc":"2.0","id":)" + QByteArray::number(id) + R"(,"method":"list"})" + '\n';
    raw.send(all);
    for (int id = 0; id < 50; ++id)
        QCOMPARE(raw.answer().value("id"), id);
}

void ControlServerTest::overlongLineIsRefusedOnceAndTheNextOneWorks()
{
    RawClient raw(bench->socketPath());
    raw.send(QByteArray(3 * ControlSession::longestLine, 'x'));
    raw.send(R"({"jsonrpc":"2.0","id":1,"method":"set","params":{"name":"battery.voltage","value":5}})");
    const auto answer = raw.ask("");
    QCOMPARE(errorCode(answer), -32600);
    QCOMPARE(errorText(answer), "a line is at most 65536 bytes long");
    QCOMPARE(bench->registry.integer(control), 4100000);
    QCOMPARE(raw.ask(R"({"jsonrpc":"2.0","id":2,"method":"list"})").value("id"), 2);
}

void ControlServerTest::garbageIsAnsweredAndTheNextMessageWorks()
{
    RawClient raw(bench->socketPath());
    QRandomGenerator random(1);
    for (int round = 0; round < 50; ++round) {
        QByteArray noise(1 + random.bounded(200), Qt::Uninitialized);
        for (auto& byte : noise)
            byte = static_cast<char>(random.bounded(256));
        noise.replace('\n', ' ');
        QCOMPARE(errorCode(raw.ask(noise)), -32700);
    }
    QVERIFY(raw.ask(R"({"jsonrpc":"2.0","id":2,"method":"list"})").contains("result"));
}

void ControlServerTest::nothingOfAnUnfinishedLineIsCarriedOut()
{
    {
        RawClient raw(bench->socketPath());
        raw.send(R"({"jsonrpc":"2.0","id":1,"method":"set","params":{"name":"battery.voltage","value":5}})");
        raw.socket.disconnectFromServer();
    }
    QVERIFY(client->call("list").isOk());
    QCOMPARE(bench->registry.integer(control), 4100000);
}

void ControlServerTest::manyClientsAreServedAtOnce()
{
    constexpr int many = 100;
    std::vector<std::unique_ptr<RawClient>> clients;
    for (int index = 0; index < many; ++index) {
        clients.push_back(std::make_unique<RawClient>(bench->socketPath()));
        // The queue of the socket is shorter than this.
        QCoreApplication::processEvents();
    }
    for (int index = 0; index < many; ++index)
        clients[size_t(index)]->send(R"({"jsonrpc":"2.0","id":)" + QByteArray::number(index) +
                                     R"(,"method":"get","params":{"name":"battery.voltage"}})" + '\n');
    for (int index = 0; index < many; ++index)
        QCOMPARE(clients[size_t(index)]->answer().value("id"), index);
}

void ControlServerTest::clientThatVanishesInTheMiddleOfAWaitLeavesNothing()
{
    {
        RawClient raw(bench->socketPath());
        raw.send("{\"jsonrpc\":\"2.0\",\"id\":1,\"method\":\"wait\",\"params\":{\"control\":\"battery.voltage\","
                 "\"value\":1}}\n{\"jsonrpc\":\"2.0\",\"id\":2,\"method\":\"events\"}\n");
        QCOMPARE(raw.answer().value("id"), 2);
    }
    QTRY_VERIFY_WITH_TIMEOUT(bench->server.findChildren<ControlSession*>().size() == 1, limit);
    QVERIFY(client->call("set", {{"name", control}, {"value", 1}}).isOk());
}

void ControlServerTest::subscriberThatNeverReadsIsDropped()
{
    RawClient raw(bench->socketPath());
    raw.socket.setReadBufferSize(1);
    raw.send("{\"jsonrpc\":\"2.0\",\"id\":1,\"method\":\"events\"}\n");
    QVERIFY(client->call("list").isOk());
    QTRY_VERIFY_WITH_TIMEOUT(bench->server.findChildren<ControlSession*>().size() == 2, limit);
    const QJsonObject big{{"text", QString(100'000, u'x')}};
    for (int round = 0; round < 1000 && bench->server.findChildren<ControlSession*>().size() == 2; ++round) {
        bench->monitor.raise("test", "flood", big);
        QCoreApplication::processEvents();
        QCoreApplication::sendPostedEvents(nullptr, QEvent::DeferredDelete);
    }
    QCOMPARE(bench->server.findChildren<ControlSession*>().size(), 1);
    QVERIFY(client->call("list").isOk());
}

void ControlServerTest::clientThatIsDroppedChangesNothingMore()
{
    const auto before = bench->registry.value(control);
    RawClient raw(bench->socketPath());
    raw.socket.setReadBufferSize(1);
    const QByteArray list("{\"jsonrpc\":\"2.0\",\"id\":1,\"method\":\"list\"}\n");
    const auto enough = 2 * ControlSession::largestBacklog / JsonRpc::resultLine(1, client->call("list").result).size();
    raw.send(list.repeated(enough) + "{\"jsonrpc\":\"2.0\",\"id\":2,\"method\":\"set\",\"params\":{\"name\":"
                                     "\"battery.voltage\",\"value\":1}}\n");
    QTRY_COMPARE_WITH_TIMEOUT(raw.socket.state(), QLocalSocket::UnconnectedState, limit);
    QTRY_COMPARE_WITH_TIMEOUT(bench->server.findChildren<ControlSession*>().size(), 1, limit);
    QCOMPARE(bench->registry.value(control), before);
}

void ControlServerTest::otherRequestsAreAnsweredDuringAWait()
{
    RawClient raw(bench->socketPath());
    raw.send(
        "{\"jsonrpc\":\"2.0\",\"id\":1,\"method\":\"wait\",\"params\":{\"control\":\"battery.voltage\",\"value\":1}}\n"
        "{\"jsonrpc\":\"2.0\",\"id\":2,\"method\":\"set\",\"params\":{\"name\":\"battery.voltage\",\"value\":2}}\n"
        "{\"jsonrpc\":\"2.0\",\"id\":3,\"method\":\"set\",\"params\":{\"name\":\"battery.voltage\",\"value\":1}}\n");
    QList<int> order;
    for (int count = 0; count < 3; ++count)
        order.append(raw.answer().value("id").toInt());
    std::sort(order.begin() + 1, order.end());
    QCOMPARE(order, (QList<int>{2, 1, 3}));
}

void ControlServerTest::waitsOfAClientAreLimited()
{
    const QByteArray wait =
        R"({"jsonrpc":"2.0","id":%1,"method":"wait","params":{"control":"battery.voltage","value":7,"within":3600}})";
    RawClient raw(bench->socketPath());
    for (qsizetype number = 0; number < ControlSession::mostWaits; ++number)
        raw.send(QByteArray(wait).replace("%1", QByteArray::number(number)) + '\n');
    const auto refused = raw.ask(QByteArray(wait).replace("%1", "\"more\""));
    QCOMPARE(refused.value("id"), "more");
    QCOMPARE(errorCode(refused), -32001);
    QCOMPARE(errorText(refused), "a client has at most 1000 waits under way");
    bench->registry.publish(control, 7);
    for (qsizetype number = 0; number < ControlSession::mostWaits; ++number)
        QCOMPARE(raw.answer().value("result"), 7);
    QCOMPARE(raw.ask(QByteArray(wait).replace("%1", "1")).value("result"), 7);
}

void ControlServerTest::logReturnsTheLinesAfterAMark()
{
    for (const auto* text : {"one", "two", "three"})
        QVERIFY(log(text));
    QTRY_COMPARE_WITH_TIMEOUT(bench->log.lines().size(), 3, limit);
    QCOMPARE(client->call("log").result.toArray().size(), 3);
    const auto later = client->call("log", {{"after", 2}}).result.toArray();
    QCOMPARE(later.size(), 1);
    QCOMPARE(later.first().toObject().value("text"), "three");
    QCOMPARE(later.first().toObject().value("number"), 3);
}

void ControlServerTest::logRefusesAMarkThatIsNone()
{
    for (const auto& mark : {QJsonValue("2"), QJsonValue(-1), QJsonValue(1.5), QJsonValue(true), QJsonValue()}) {
        const auto reply = client->call("log", {{"after", mark}});
        QCOMPARE(reply.code, -32602);
        QCOMPARE(reply.message, "\"after\" takes a whole number from 0");
    }
}

void ControlServerTest::keysAndPicturesNeedAProgram()
{
    for (const auto& reply : {client->call("press", {{"key", "F5"}}), client->call("release", {{"key", "F5"}}),
                              client->call("hold", {{"key", "F5"}, {"milliseconds", 1}}), client->call("screenshot")}) {
        QCOMPARE(reply.code, -32001);
        QCOMPARE(reply.message, "the program shows no window");
    }
}

void ControlServerTest::clientReportsALostConnection()
{
    QTimer::singleShot(50, this, [this] { delete bench->server.findChild<ControlSession*>(); });
    const auto reply = client->call("wait", {{"log", "never"}, {"within", 60}});
    QCOMPARE(reply.code, ControlClient::connectionLost);
    QVERIFY(!client->isOpen());
    QCOMPARE(client->call("list").code, ControlClient::connectionLost);
}

/// What the server itself says that it takes.
void ControlServerTest::documentNamesEveryMethodAndParameter()
{
    QFile file(SOURCE_FOLDER "/docs/virtual-device.md");
    QVERIFY(file.open(QIODevice::ReadOnly));
    const QString page = QString::fromUtf8(file.readAll()).section("## The control socket", 1).section("\n## ", 0, 0);
    QStringList documented;
    static const QRegularExpression row("^\\| `([a-z]+)` \\|([^|]*)\\|[^|]*\\|$", QRegularExpression::MultilineOption);
    static const QRegularExpression parameter("`([a-z]+)`");
    RawClient raw(bench->socketPath());
    for (const auto& match : row.globalMatch(page)) {
        QStringList parameters;
        for (const auto& name : parameter.globalMatch(match.captured(2)))
            parameters.append(name.captured(1));
        parameters.removeDuplicates();
        const auto refused = raw.ask(R"({"jsonrpc":"2.0","id":1,"method":")" + match.captured(1).toUtf8() +
                                     R"(","params":{"bogus":1}})");
        QCOMPARE(errorText(refused), "unknown parameter \"bogus\"; allowed: " +
                                         (parameters.isEmpty() ? QString("none") : parameters.join(", ")));
        documented.append(match.captured(1));
    }
    QCOMPARE(errorText(raw.ask(R"({"jsonrpc":"2.0","id":1,"method":"bogus"})")),
             "unknown method \"bogus\"; methods: " + documented.join(", "));
}

void ControlServerTest::lineSplitterCutsAnyPieces()
{
    LineSplitter splitter(4);
    splitter.append("a");
    QVERIFY(!splitter.next());
    splitter.append("b\r\n\nabcd\nabcde\nx");
    QCOMPARE(splitter.next()->text, "ab");
    QCOMPARE(splitter.next()->text, "");
    const auto longest = splitter.next();
    QCOMPARE(longest->text, "abcd");
    QVERIFY(!longest->isTooLong);
    const auto tooLong = splitter.next();
    QVERIFY(tooLong->isTooLong);
    QVERIFY(tooLong->text.isEmpty());
    QVERIFY(!splitter.next());
    splitter.append("yzzz");
    QVERIFY(!splitter.next());
    splitter.append("zz");
    QVERIFY(!splitter.next());
    splitter.append("\nok\n");
    QVERIFY(splitter.next()->isTooLong);
    QCOMPARE(splitter.next()->text, "ok");
}

QTEST_GUILESS_MAIN(ControlServerTest)
#include "ControlServerTest.moc"
