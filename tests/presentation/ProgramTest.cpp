// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/presentation/WidgetProbe.h"
#include "tests/support/LogCapture.h"

#include <QProcess>
#include <QTemporaryDir>
#include <QTest>

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <csignal>

using TestSupport::LogCapture;

namespace
{

const QString started = QStringLiteral("Starting ImmunityRig");
const QString probeFile = QStringLiteral("/mnt/data/testfile");
const QString screenReport = QStringLiteral("/mnt/screen-probe");
#ifdef __SANITIZE_THREAD__
constexpr bool handsOnSignals = false;
#else
constexpr bool handsOnSignals = true;
#endif
constexpr const char* const deferred = "the thread sanitizer holds a signal back until the system call has ended";

constexpr const char* gauge = "/sys/class/power_supply/ds2780-battery.0/voltage_now";
constexpr int patienceMs = 60'000;

/// The program as it ships, on a device whose files the case has laid out.
class Program : public QProcess
{
public:
    Program()
    {
        auto environment = QProcessEnvironment::systemEnvironment();
        environment.remove(QStringLiteral("QT_PLUGIN_PATH"));
        environment.remove(QStringLiteral("QT_QPA_PLATFORM_PLUGIN_PATH"));
        setProcessEnvironment(environment);
        setProgram(qEnvironmentVariable("IMMUNITYRIG_BUILD") + QStringLiteral("/presentation/immunityrig"));
    }

    ~Program() override
    {
        kill();
        waitForFinished();
    }

    /// Standard error is this descriptor instead.
    void setErrors(int descriptor)
    {
        setChildProcessModifier([descriptor] { ::dup2(descriptor, STDERR_FILENO); });
    }

    /// With a plugin of the test inside it.
    void startWithScreenProbe()
    {
        auto environment = processEnvironment();
        environment.insert(QStringLiteral("QT_PLUGIN_PATH"),
                           qEnvironmentVariable("IMMUNITYRIG_BUILD") + QStringLiteral("/tests/plugins"));
        environment.insert(QStringLiteral("QT_QPA_GENERIC_PLUGINS"), QStringLiteral("screenprobe"));
        setProcessEnvironment(environment);
        start();
    }

    /// With a sound card that gives its samples to a file.
    void startWithSoundCard(const QTemporaryDir& folder, const QString& samples)
    {
        QFile file(folder.filePath(QStringLiteral("asound.conf")));
        QVERIFY(file.open(QIODevice::WriteOnly));
        file.write("pcm.default { type plug slave.pcm { type file slave.pcm { type null } format raw file \"" +
                   samples.toUtf8() + "\" } }\n");
        file.close();
        auto environment = processEnvironment();
        environment.insert(QStringLiteral("SDL_AUDIODRIVER"), QStringLiteral("alsa"));
        environment.insert(QStringLiteral("ALSA_CONFIG_PATH"), file.fileName());
        setProcessEnvironment(environment);
        start();
    }

    /// One that has ended has no id: the number 0 would stand for the test's own process group.
    void signal(int number) const
    {
        if (processId() > 0)
            ::kill(static_cast<pid_t>(processId()), number);
    }

    /// Waits for it to end by itself, and without complaint.
    [[nodiscard]] bool endsOrderly()
    {
        return QTest::qWaitFor([this] { return state() == NotRunning; }, patienceMs) && exitStatus() == NormalExit &&
               exitCode() == 0;
    }

    /// Whether it is set to handle the signal itself. Asked once it has logged something: before, it is still a fork of
    /// the test, with the test's handlers.
    [[nodiscard]] bool catches(int number) const
    {
        QFile status(QStringLiteral("/proc/%1/status").arg(processId()));
        if (!status.open(QIODevice::ReadOnly))
            return false;
        const auto lines = status.readAll().split('\n');
        for (const auto& line : lines) {
            if (line.startsWith("SigCgt:"))
                return ((line.mid(7).trimmed().toULongLong(nullptr, 16) >> (number - 1)) & 1U) != 0;
        }
        return false;
    }
};

/// A pipe that takes not a byte more, and whose reader is there and reads nothing.
class FullPipe
{
public:
    FullPipe()
    {
        if (::pipe2(ends, O_CLOEXEC | O_NONBLOCK) != 0)
            qFatal("no pipe");
        while (::write(ends[1], "x", 1) == 1) {
        }
        ::fcntl(ends[1], F_SETFL, 0);
    }
    ~FullPipe()
    {
        ::close(ends[0]);
        ::close(ends[1]);
    }
    FullPipe(const FullPipe&) = delete;
    FullPipe& operator=(const FullPipe&) = delete;

    [[nodiscard]] int input() const { return ends[1]; }

private:
    int ends[2] = {-1, -1};
};

/// The card's check ran again: it wrote the probe file that has just been removed.
bool pollsAgain()
{
    QFile::remove(probeFile);
    return QTest::qWaitFor([] { return QFile::exists(probeFile); }, patienceMs);
}

bool hasScreenReport()
{
    return QTest::qWaitFor([] { return QFile::exists(screenReport); }, patienceMs);
}

/// A gauge that never answers holds the program's start until somebody writes to it. On the way there the DSP's library
/// may set signal handlers of its own, and the program puts back what it found: only then its own ones stay.
void startHeldByItsGauge(Program& program, const LogCapture& log)
{
    QDir().mkpath(QFileInfo(QString::fromLatin1(gauge)).path());
    QCOMPARE(::mkfifo(gauge, 0644), 0);
    program.start();
    QVERIFY(log.waitFor(QStringLiteral("DspPort: open complete.")));
    QVERIFY(program.catches(SIGTERM));
}

} // namespace

class ProgramTest : public QObject
{
    Q_OBJECT

private slots:
    void init()
    {
        QDir().mkpath(QStringLiteral("/sys/block/mmcblk0"));
        QDir().mkpath(QStringLiteral("/mnt/data"));
    }

    void cleanup()
    {
        TestSupport::removePath(QStringLiteral("/sys/block"));
        TestSupport::removePath(QStringLiteral("/sys/class"));
        TestSupport::removePath(QStringLiteral("/mnt/data"));
        TestSupport::removePath(screenReport);
    }

    /// The compiled-in configuration points Qt to a folder without plugins, and no variable says where they are.
    void startsByItselfAndSaysSoFirst()
    {
        const LogCapture log;
        Program program;
        program.start();
        QVERIFY(log.waitFor(started));
        const auto first = log.lines().front();
        QCOMPARE(first.text, started);
        QCOMPARE(first.identity, QStringLiteral("VQK"));
        QCOMPARE(first.priority, LOG_INFO);
        QCOMPARE(first.facility, 1);
        QVERIFY(pollsAgain());
        QCOMPARE(program.state(), QProcess::Running);
    }

    void argumentsGoToTheToolkit()
    {
        const LogCapture log;
        Program program;
        auto environment = program.processEnvironment();
        environment.remove(QStringLiteral("QT_QPA_PLATFORM"));
        program.setProcessEnvironment(environment);
        program.setArguments({QStringLiteral("-platform"), QStringLiteral("offscreen")});
        program.start();
        QVERIFY(log.waitFor(started));
        QVERIFY(pollsAgain());
        QCOMPARE(program.state(), QProcess::Running);
    }

    /// The toolkit refuses in the application object.
    void saysThatItStartsBeforeTheToolkitDoes()
    {
        const LogCapture log;
        Program program;
        program.setArguments({QStringLiteral("-platform"), QStringLiteral("nonsense")});
        program.start();
        QTRY_COMPARE_WITH_TIMEOUT(program.state(), QProcess::NotRunning, patienceMs);
        QCOMPARE(program.exitStatus(), QProcess::CrashExit);
        QVERIFY(program.readAllStandardError().contains("nonsense"));
        QVERIFY(log.waitFor(started));
        QCOMPARE(log.texts(), QStringList{started});
    }

    void goesOnWhenItsWindowIsClosed()
    {
        Program program;
        program.startWithScreenProbe();
        QVERIFY(hasScreenReport());
        QVERIFY(TestSupport::readFile(screenReport).contains("closed=1\n"));
        for (int second = 0; second < 2; ++second)
            QVERIFY(pollsAgain());
        QCOMPARE(program.state(), QProcess::Running);
    }

    void tellsTheFramebufferNotToStretchTheWindow()
    {
        Program program;
        program.startWithScreenProbe();
        QVERIFY(hasScreenReport());
        QVERIFY(TestSupport::readFile(screenReport).startsWith("QT_QPA_FB_FORCE_FULLSCREEN=0\n"));
    }

    /// The linker would leave them out of the program if they lay in a library.
    void holdsItsResources()
    {
        Program program;
        program.startWithScreenProbe();
        QVERIFY(hasScreenReport());
        const QByteArray report = TestSupport::readFile(screenReport);
        QVERIFY2(report.contains("configuration=26\nsound=64044\nprefix=/usr/share\n"), report);
    }

    /// Texts fit their regions, whatever the surroundings say of the display and the toolkit of its default font.
    void textIsAsLargeAsTheLayoutWasMadeFor()
    {
        Program program;
        auto environment = program.processEnvironment();
        environment.insert(QStringLiteral("QT_FONT_DPI"), QStringLiteral("300"));
        program.setProcessEnvironment(environment);
        program.startWithScreenProbe();
        QVERIFY(hasScreenReport());
        const QByteArray report = TestSupport::readFile(screenReport);
        QVERIFY2(report.contains("\nQT_FONT_DPI=96\n"), report);
        QVERIFY2(report.contains("\npoints=9\n"), report);
    }

    /// What is logged after the log has been closed carries the name of the program.
    void closesTheLogBeforeTheWindowIsDestroyed()
    {
        const LogCapture log;
        Program program;
        program.startWithScreenProbe();
        QVERIFY(hasScreenReport());
        program.signal(SIGTERM);
        QVERIFY(log.waitFor(QStringLiteral("window destroyed")));
        const auto lines = log.lines();
        const auto last =
            std::find_if(lines.begin(), lines.end(), [](const auto& line) { return line.text == u"window destroyed"; });
        QCOMPARE(last->identity, QStringLiteral("immunityrig"));
        QVERIFY(program.endsOrderly());
    }

    void endsOrderlyOnATerminationSignal_data()
    {
        QTest::addColumn<int>("number");
        QTest::newRow("SIGTERM") << SIGTERM;
        QTest::newRow("SIGINT") << SIGINT;
    }

    void endsOrderlyOnATerminationSignal()
    {
        QFETCH(int, number);
        Program program;
        program.start();
        QVERIFY(pollsAgain());
        program.signal(number);
        QVERIFY(program.endsOrderly());
    }

    /// A sound card that has died in the middle of a buffer: here a pipe that nobody reads.
    void endsOrderlyWhenTheSoundCardTakesNoSamples()
    {
        const QTemporaryDir folder;
        const QString samples = folder.filePath(QStringLiteral("samples"));
        QCOMPARE(::mkfifo(qPrintable(samples), 0600), 0);
        const int card = ::open(qPrintable(samples), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        const int capacity = ::fcntl(card, F_GETPIPE_SZ);
        const auto isFull = [&] {
            int waiting = 0;
            return ::ioctl(card, FIONREAD, &waiting) == 0 && waiting == capacity;
        };
        Program program;
        program.startWithSoundCard(folder, samples);
        QVERIFY(QTest::qWaitFor(isFull, patienceMs));
        QVERIFY(pollsAgain());
        program.signal(SIGTERM);
        QVERIFY(program.endsOrderly());
        QVERIFY(isFull());
        ::close(card);
    }

    /// The gauge holds the event loop, which the first signal would end.
    void aSecondSignalKillsAProgramThatHangs()
    {
        if (!handsOnSignals)
            QSKIP(deferred);
        const LogCapture log;
        Program program;
        startHeldByItsGauge(program, log);
        program.signal(SIGTERM);
        QTRY_VERIFY_WITH_TIMEOUT(!program.catches(SIGTERM) && !program.catches(SIGINT), patienceMs);
        QCOMPARE(program.state(), QProcess::Running);
        program.signal(SIGINT);
        QVERIFY(program.waitForFinished(patienceMs));
        QCOMPARE(program.exitStatus(), QProcess::CrashExit);
        QCOMPARE(program.exitCode(), SIGINT);
    }

    void aSignalDuringStartUpEndsItAsSoonAsTheWindowStands()
    {
        if (!handsOnSignals)
            QSKIP(deferred);
        const LogCapture log;
        Program program;
        startHeldByItsGauge(program, log);
        program.signal(SIGTERM);
        QTRY_VERIFY_WITH_TIMEOUT(!program.catches(SIGTERM), patienceMs);
        const int writer = ::open(gauge, O_WRONLY | O_CLOEXEC);
        QFile::remove(QString::fromLatin1(gauge)); // or the next look holds it again
        ::close(writer);
        QVERIFY(program.endsOrderly());
    }

    /// Without a clock it has something to say every second.
    void goesOnWhenNobodyReadsItsErrorsAnyMore()
    {
        Program program;
        program.start();
        QVERIFY(pollsAgain());
        program.closeReadChannel(QProcess::StandardError);
        for (int second = 0; second < 3; ++second)
            QVERIFY(pollsAgain());
        QCOMPARE(program.state(), QProcess::Running);
    }

    /// Neither the clock's messages nor the keys' and the gauge's may wait for a reader who never comes.
    void goesOnWhenItsErrorsFillThePipe()
    {
        const FullPipe pipe;
        Program program;
        program.setErrors(pipe.input());
        program.start();
        for (int second = 0; second < 3; ++second)
            QVERIFY(pollsAgain());
        QCOMPARE(program.state(), QProcess::Running);
        program.signal(SIGTERM);
        QVERIFY(program.endsOrderly());
    }

    void goesOnWithoutALogService()
    {
        Program program;
        program.start();
        QVERIFY(pollsAgain());
        QCOMPARE(program.state(), QProcess::Running);
    }
};

QTEST_GUILESS_MAIN(ProgramTest)
#include "ProgramTest.moc"
