// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/SerialPort.h"

#include "Domain/src/DomainLayer/ReadThread.h"
#include "utilities/Debug.h"
#include "utilities/SourceWarnings.h"

#include <QByteArray>
#include <QCoreApplication>
#include <QFile>

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <condition_variable>
#include <csignal>
#include <cstring>
#include <ctime>
#include <mutex>
#include <utility>

namespace Domain
{

namespace
{

using std::chrono::milliseconds;

/// How long a stop request may go unseen, and how long a line that gives only errors is left alone.
constexpr timespec pollTimeout{0, 500'000'000};
constexpr milliseconds pollPause{500};
constexpr timespec writePatience{0, 500'000'000};
constexpr milliseconds closeStep{1};
constexpr int closePatienceMs = 5000;
constexpr std::size_t chunkSize = 46;
/// With this much unread the line is left to wait in the driver.
constexpr qsizetype fullBuffer = 256 * 1024;

const Utilities::SourceWarnings warn(QStringLiteral(__FILE__));

/// The C library's text for an error, the thread-safe way.
QString errorText(int error)
{
    std::array<char, 256> buffer{};
    return Utilities::Debug::literal(QString::fromLocal8Bit(::strerror_r(error, buffer.data(), buffer.size())));
}

class FileDescriptor
{
public:
    FileDescriptor() = default;
    explicit FileDescriptor(int opened) : descriptor(opened) {}
    ~FileDescriptor() { close(); }
    FileDescriptor(const FileDescriptor&) = delete;
    FileDescriptor& operator=(const FileDescriptor&) = delete;

    bool open(const QString& name, int flags)
    {
        descriptor = ::open(QFile::encodeName(name).constData(), flags);
        return isOpen();
    }
    void close()
    {
        if (isOpen())
            ::close(std::exchange(descriptor, -1));
    }
    [[nodiscard]] bool isOpen() const { return descriptor >= 0; }
    [[nodiscard]] int get() const { return descriptor; }

private:
    int descriptor = -1;
};

/// Never the controlling terminal, whose hang-up would end the program; never blocking, so that neither a driver that
/// takes nothing nor a missing carrier can hold a thread.
int openFlags(QIODevice::OpenMode mode)
{
    constexpr int always = O_NOCTTY | O_NONBLOCK | O_CLOEXEC;
    if (mode.testFlag(QIODevice::ReadWrite))
        return O_RDWR | always;
    return (mode.testFlag(QIODevice::WriteOnly) ? O_WRONLY : O_RDONLY) | always;
}

} // namespace

class SerialPort::PrivateData
{
public:
    PrivateData(SerialPort& port, const QString& name, Baud speed)
        : owner(port), portName(name), deviceName(name), baud(speed)
    {
    }

    [[nodiscard]] bool openDevice(OpenMode mode);
    void configureLine() const;
    [[nodiscard]] bool startReading();
    void requestStop();
    void finishReading();
    void waitForReadLoop();

    void readUntilStopped();
    void readChunk();
    void rest(milliseconds duration);
    void waitForRoom();

    [[nodiscard]] ssize_t write(const char* bytes, std::size_t count);

    SerialPort& owner;
    QString portName;
    const QString deviceName;
    const Baud baud;
    std::atomic<bool> keepRunning = false;
    std::atomic<bool> readLoopFinished = true;
    QByteArray receiveBuffer;
    mutable std::mutex lock; ///< guards the receive buffer, and every change that somebody sleeps for
    std::condition_variable changed;
    std::mutex writing; ///< the driver turns away whoever comes while another one writes
    ReadThread readThread;
    FileDescriptor file;
    FileDescriptor stopEvent{::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC)};
};

bool SerialPort::PrivateData::openDevice(OpenMode mode)
{
    if (file.isOpen())
        errno = EBUSY;
    else if (!(mode & ReadWrite))
        errno = EINVAL;
    else
        return file.open(deviceName, openFlags(mode));
    return false;
}

void SerialPort::PrivateData::configureLine() const
{
    termios settings{};
    settings.c_iflag = IGNPAR;
    settings.c_cflag = baud | CS8 | CREAD | CLOCAL;
    settings.c_cc[VTIME] = 0;
    settings.c_cc[VMIN] = 1;
    // A device without line settings still carries bytes, so the results do not matter.
    ::tcflush(file.get(), TCIFLUSH);
    ::tcsetattr(file.get(), TCSANOW, &settings);
}

/// The flags are set before the thread exists: a `close` that comes before the loop's first step must find them set.
bool SerialPort::PrivateData::startReading()
{
    if (!readThread.wait(0))
        return false;
    eventfd_t stale = 0;
    ::eventfd_read(stopEvent.get(), &stale);
    keepRunning = true;
    readLoopFinished = false;
    if (readThread.begin())
        return true;
    finishReading();
    return false;
}

void SerialPort::PrivateData::requestStop()
{
    {
        const std::lock_guard guard(lock);
        keepRunning = false;
    }
    changed.notify_all();
    ::eventfd_write(stopEvent.get(), 1);
}

void SerialPort::PrivateData::finishReading()
{
    {
        const std::lock_guard guard(lock);
        keepRunning = false;
        readLoopFinished = true;
    }
    changed.notify_all();
}

void SerialPort::PrivateData::readUntilStopped()
{
    while (keepRunning) {
        waitForRoom();
        std::array<pollfd, 2> waits{pollfd{file.get(), POLLIN, 0}, pollfd{stopEvent.get(), POLLIN, 0}};
        if (::ppoll(waits.data(), waits.size(), &pollTimeout, nullptr) < 0) {
            if (errno == EINTR)
                continue;
            warn(__LINE__, QStringLiteral("Select failed in serial port read thread"));
            rest(pollPause);
        } else if (waits[0].revents != 0) {
            readChunk();
        }
    }
}

void SerialPort::PrivateData::readChunk()
{
    std::array<char, chunkSize> chunk; // NOLINT(cppcoreguidelines-pro-type-member-init): written by read
    const auto count = ::read(file.get(), chunk.data(), chunk.size());
    if (count > 0) {
        {
            const std::lock_guard guard(lock);
            receiveBuffer.append(chunk.data(), count);
        }
        emit owner.readyRead();
        return;
    }
    // A line that has hung up is ready at once and for ever, with nothing to read.
    if (count == 0 || (errno != EINTR && errno != EAGAIN))
        rest(pollPause);
    else if (errno == EAGAIN)
        rest(milliseconds(1));
}

void SerialPort::PrivateData::rest(milliseconds duration)
{
    std::unique_lock guard(lock);
    changed.wait_for(guard, duration, [this] { return !keepRunning; });
}

/// Short steps, between which `close` serves its caller's events.
void SerialPort::PrivateData::waitForReadLoop()
{
    std::unique_lock guard(lock);
    changed.wait_for(guard, closeStep, [this] { return readLoopFinished.load(); });
}

void SerialPort::PrivateData::waitForRoom()
{
    std::unique_lock guard(lock);
    changed.wait(guard, [this] { return !keepRunning || receiveBuffer.size() < fullBuffer; });
}

/// A driver that takes nothing for the whole patience fails the write; an interrupted call has written nothing.
ssize_t SerialPort::PrivateData::write(const char* bytes, std::size_t count)
{
    const std::lock_guard guard(writing);
    const auto attempt = [&] {
        ssize_t written = 0;
        do
            written = ::write(file.get(), bytes, count);
        while (written < 0 && errno == EINTR);
        return written;
    };
    auto written = attempt();
    if (written < 0 && errno == EAGAIN) {
        pollfd room{file.get(), POLLOUT, 0};
        sigset_t signalsLeftForLater;
        ::sigfillset(&signalsLeftForLater);
        ::ppoll(&room, 1, &writePatience, &signalsLeftForLater);
        written = attempt();
    }
    return written;
}

SerialPort::SerialPort(const QString& portName, Baud baud, QObject* parent)
    : QIODevice(parent), data(std::make_unique<PrivateData>(*this, portName, baud))
{
    connect(&data->readThread, SIGNAL(started()), this, SLOT(pollPort()), Qt::DirectConnection);
}

SerialPort::~SerialPort()
{
    if (isOpen())
        SerialPort::close();
    // A thread that was late for `close` is waited for here: it still uses this object.
    data->requestStop();
    data->readThread.quit();
    data->readThread.wait();
}

void SerialPort::setPortName(const QString& portName)
{
    data->portName = portName;
}

bool SerialPort::isSequential() const
{
    return true;
}

bool SerialPort::open(OpenMode mode)
{
    if (!QIODevice::open(mode | Unbuffered)) {
        warn(__LINE__, QStringLiteral("Unable to open serial port"));
        return false;
    }
    // The base class finds out on first use that the device is sequential, and remembers it. That must not happen in a
    // reading and a writing thread at once.
    (void)QIODevice::bytesAvailable();
    if (!data->openDevice(mode)) {
        warn(__LINE__, QStringLiteral("Serial port open failed.  Error code = %1").arg(errorText(errno)));
        return false;
    }
    data->configureLine();
    if (!(mode & ReadOnly))
        return true;
    if (!data->startReading()) {
        warn(__LINE__, QStringLiteral("Previous read thread is not finished."));
        return false;
    }
    return true;
}

void SerialPort::close()
{
    data->requestStop();
    while (!data->readLoopFinished) {
        QCoreApplication::processEvents(QEventLoop::ExcludeUserInputEvents);
        data->waitForReadLoop();
    }
    if (!data->readThread.queueQuit())
        warn(__LINE__, QStringLiteral("Invoke of quit for read thread failed"));
    if (!data->readThread.wait(closePatienceMs))
        warn(__LINE__, QStringLiteral("Read thread took too long to finish"));
    data->file.close();
    QIODevice::close();
}

qint64 SerialPort::bytesAvailable() const
{
    const std::lock_guard guard(data->lock);
    return data->receiveBuffer.size() + QIODevice::bytesAvailable();
}

bool SerialPort::canReadLine() const
{
    const std::lock_guard guard(data->lock);
    return data->receiveBuffer.contains('\n') || QIODevice::canReadLine();
}

void SerialPort::pollPort()
{
    if (isOpen())
        data->readUntilStopped();
    else
        warn(__LINE__, QStringLiteral("Attempting to read from a serial port that is not open"));
    data->finishReading();
}

qint64 SerialPort::readData(char* destination, qint64 maximum)
{
    if (!data->keepRunning)
        return -1;
    qint64 count = 0;
    {
        const std::lock_guard guard(data->lock);
        count = std::min(maximum, data->receiveBuffer.size());
        std::copy_n(data->receiveBuffer.constData(), count, destination);
        data->receiveBuffer.remove(0, count);
    }
    data->changed.notify_all();
    return count;
}

qint64 SerialPort::writeData(const char* bytes, qint64 count)
{
    if (data->write(bytes, static_cast<std::size_t>(count)) >= 0)
        return count;
    warn(__LINE__, QStringLiteral("Serial port write failed.  Error code = %1").arg(errorText(errno)));
    return -1;
}

} // namespace Domain
