// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/StandardError.h"

#include "utilities/Debug.h"
#include "utilities/LogWriter.h"

#include <QProcess>
#include <QTemporaryFile>
#include <QTest>

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <functional>
#include <utility>

using Utilities::Debug;
using Utilities::StandardError;

namespace
{

const QString fatalArgument = QStringLiteral("--end-by-a-fatal-message");

/// Standard error is a pipe of its own as long as it lives.
class ErrorPipe
{
public:
    ErrorPipe() : before(::fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 0))
    {
        if (::pipe2(ends, O_CLOEXEC) != 0)
            qFatal("no pipe");
        ::dup2(ends[1], STDERR_FILENO);
    }
    ~ErrorPipe()
    {
        restore();
        ::close(ends[0]);
        ::close(ends[1]);
        ::close(before);
    }
    ErrorPipe(const ErrorPipe&) = delete;
    ErrorPipe& operator=(const ErrorPipe&) = delete;

    void closeReader() { ::close(std::exchange(ends[0], -1)); }

    /// Standard error is what it was.
    void restore() const { ::dup2(before, STDERR_FILENO); }

    /// Not a byte more fits.
    void fill() const
    {
        ::fcntl(ends[1], F_SETFL, O_NONBLOCK);
        while (::write(ends[1], "x", 1) == 1) {
        }
        ::fcntl(ends[1], F_SETFL, 0);
    }

    [[nodiscard]] int flags() const { return ::fcntl(ends[1], F_GETFL); }

    /// What is in it now.
    [[nodiscard]] QByteArray take() const
    {
        ::fcntl(ends[0], F_SETFL, O_NONBLOCK);
        QByteArray all;
        char chunk[4096];
        for (auto size = ::read(ends[0], chunk, sizeof chunk); size > 0; size = ::read(ends[0], chunk, sizeof chunk))
            all.append(chunk, size);
        return all;
    }

private:
    int before;
    int ends[2] = {-1, -1};
};

/// What standard error gets from it, with this handler of Qt's messages: null stands for Qt's own.
QByteArray written(const std::function<void()>& say, const std::function<void()>& install)
{
    const ErrorPipe pipe;
    auto* const previous = qInstallMessageHandler(nullptr);
    install();
    say();
    // What were written after its call had returned would miss the pipe.
    pipe.restore();
    qInstallMessageHandler(previous);
    return pipe.take();
}

} // namespace

class StandardErrorTest : public QObject
{
    Q_OBJECT

private slots:
    void linesAreThoseThatQtWrites_data()
    {
        QTest::addColumn<std::function<void()>>("say");
        QTest::addColumn<QByteArray>("line");
        const auto row = [](const char* name, const std::function<void()>& say, const QByteArray& line) {
            QTest::newRow(name) << say << line;
        };
        row(
            "debug", [] { qDebug("Unable to open RTC "); }, "Unable to open RTC \n");
        row(
            "a number", [] { qDebug("Unknown key pressed : %d", 7); }, "Unknown key pressed : 7\n");
        row(
            "streamed", [] { qDebug() << "key" << 7; }, "key 7\n");
        row(
            "information", [] { qInfo("information"); }, "information\n");
        row(
            "warning", [] { qWarning("warning"); }, "warning\n");
        row(
            "critical", [] { qCritical("critical"); }, "critical\n");
        row(
            "nothing", [] { qDebug("%s", ""); }, "\n");
        row(
            "two lines", [] { qDebug("one\ntwo"); }, "one\ntwo\n");
        row(
            "percent signs", [] { qDebug("%s", "%n%s"); }, "%n%s\n");
        row(
            "beyond ASCII", [] { qDebug("%ls", qUtf16Printable(QStringLiteral("\u00e9\u20ac"))); }, "\u00e9\u20ac\n");
        row(
            "a pattern",
            [] {
                qSetMessagePattern(QStringLiteral("%{type}: %{message}"));
                qWarning("text");
            },
            "warning: text\n");
        row(
            "a pattern for others",
            [] {
                qSetMessagePattern(QStringLiteral("%{if-critical}%{message}%{endif}"));
                qWarning("text");
            },
            "");
        row(
            "an empty pattern",
            [] {
                qSetMessagePattern(QString());
                qWarning("text");
            },
            "");
    }

    void linesAreThoseThatQtWrites()
    {
        QFETCH(const std::function<void()>, say);
        const auto restorePattern =
            qScopeGuard([] { qSetMessagePattern(QStringLiteral("%{if-category}%{category}: %{endif}%{message}")); });
        const QByteArray ownLine = written(say, [] {});
        QCOMPARE(written(say, &StandardError::keepFromBlocking), ownLine);
        QTEST(ownLine, "line");
    }

    void linesKeepTheirPlaceAmongTheLogsEcho()
    {
        const auto say = [] {
            Debug::info("one");
            qDebug("two");
            Debug::info("three");
        };
        Debug::open();
        QCOMPARE(written(say, &StandardError::keepFromBlocking), QByteArray("VQK: one\ntwo\nVQK: three\n"));
    }

    void aReaderThatReadsNothingHoldsNobodyUp()
    {
        const ErrorPipe pipe;
        auto* const previous = qInstallMessageHandler(nullptr);
        StandardError::keepFromBlocking();
        pipe.fill();
        constexpr auto far = 5 * Utilities::LogWriter::capacity;
        for (std::size_t line = 0; line < far; ++line)
            qDebug("nobody reads this");
        qInstallMessageHandler(previous);

        // Reached at all: no call above blocked. The reader comes back and gets what was kept for it.
        QByteArray read;
        const auto lines = [&] {
            read += pipe.take();
            return static_cast<std::size_t>(read.count("nobody reads this\n"));
        };
        QTRY_VERIFY_WITH_TIMEOUT(lines() >= Utilities::LogWriter::capacity, 20'000);
    }

    void theLogsEchoWaitsForItsReader()
    {
        Debug::open();
        const ErrorPipe pipe;
        auto* const previous = qInstallMessageHandler(nullptr);
        StandardError::keepFromBlocking();
        qInstallMessageHandler(previous);
        pipe.fill();
        constexpr int lines = 20;
        for (int line = 0; line < lines; ++line)
            Debug::info("read late");
        QByteArray read;
        const auto echoes = [&] {
            read += pipe.take();
            return static_cast<int>(read.count("VQK: read late\n"));
        };
        QTRY_COMPARE_WITH_TIMEOUT(echoes(), lines, 20'000);
    }

    /// As the libraries do, which know nothing of the log's writer.
    void whoWritesByHimselfIsNotHeldUpEither()
    {
        const ErrorPipe pipe;
        auto* const previous = qInstallMessageHandler(nullptr);
        StandardError::keepFromBlocking();
        qInstallMessageHandler(previous);
        pipe.fill();
        QCOMPARE(::write(STDERR_FILENO, "x", 1), -1);
        QCOMPARE(errno, EAGAIN);
        // The other way into the pipe, which may be another process's, still waits for its reader.
        QCOMPARE(pipe.flags() & O_NONBLOCK, 0);
    }

    void aFileIsWrittenOnWhereItEnds()
    {
        QTemporaryFile file;
        QVERIFY(file.open());
        file.write("before\n");
        file.flush();
        const ErrorPipe pipe;
        ::dup2(file.handle(), STDERR_FILENO);
        auto* const previous = qInstallMessageHandler(nullptr);
        StandardError::keepFromBlocking();
        qDebug("after");
        qInstallMessageHandler(previous);
        pipe.restore();
        QVERIFY(file.seek(0));
        QCOMPARE(file.readAll(), QByteArray("before\nafter\n"));
    }

    void withoutAReaderTheLineIsLost()
    {
        std::signal(SIGPIPE, SIG_IGN);
        ErrorPipe pipe;
        pipe.closeReader();
        auto* const previous = qInstallMessageHandler(nullptr);
        StandardError::keepFromBlocking();
        qDebug("nobody is there");
        const ErrorPipe next;
        qDebug("somebody is there");
        next.restore();
        qInstallMessageHandler(previous);
        QCOMPARE(next.take(), QByteArray("somebody is there\n"));
    }

    /// A pipe takes 64 KiB at once.
    void aLineLongerThanAPipeArrivesWhole()
    {
        const ErrorPipe pipe;
        auto* const previous = qInstallMessageHandler(nullptr);
        StandardError::keepFromBlocking();
        const QByteArray line(300'000, 'x');
        qDebug("%s", line.constData());
        qInstallMessageHandler(previous);
        QByteArray read;
        QTRY_COMPARE_WITH_TIMEOUT((read += pipe.take()).size(), line.size() + 1, 20'000);
        QVERIFY(read == line + '\n');
    }

    void aFatalMessageIsWrittenBeforeTheProcessEnds()
    {
        QProcess process;
        process.start(QCoreApplication::applicationFilePath(), {fatalArgument});
        QVERIFY(process.waitForFinished(60'000));
        QCOMPARE(process.exitStatus(), QProcess::CrashExit);
        QCOMPARE(process.exitCode(), SIGABRT);
        QCOMPARE(process.readAllStandardError(), QByteArray("the end\n"));
    }
};

int main(int argc, char** argv)
{
    const QCoreApplication application(argc, argv);
    if (QCoreApplication::arguments().contains(fatalArgument)) {
        StandardError::keepFromBlocking();
        qFatal("the end");
    }
    StandardErrorTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "StandardErrorTest.moc"
