// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/BeaconProcessor.h"
#include "Domain/src/DomainLayer/SerialPort.h"
#include "tests/Domain/Pty.h"

#include <QCoreApplication>

#include <algorithm>
#include <cstdint>

namespace
{

/// A processor on a line whose other end takes everything and says nothing.
struct Link
{
    TestSupport::Pty pty;
    Domain::SerialPort port{pty.name(), Domain::SerialPort::Baud115200};
    Domain::BeaconProcessor processor{port};
};

/// Made once: every input goes on in the state that the one before has left.
Link& link()
{
    static int argc = 1;
    static char name[] = "fuzz";
    static char* argv[] = {name, nullptr};
    static const QCoreApplication application(argc, argv);
    static Link made;
    return made;
}

void handle(const QByteArray& message)
{
    QMetaObject::invokeMethod(&link().processor, "processMessage", Qt::BlockingQueuedConnection,
                              Q_ARG(QByteArray, message));
}

} // namespace

/// The input is a list of messages, each behind a byte with its length; a command goes out before each, so that
/// acknowledgements have something to acknowledge and a queue to send from.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size)
{
    QByteArray input(reinterpret_cast<const char*>(bytes), static_cast<qsizetype>(size));
    while (!input.isEmpty()) {
        const auto length = std::min<qsizetype>(static_cast<std::uint8_t>(input.front()), input.size() - 1);
        link().processor.sendPing();
        handle(input.sliced(1, length));
        input.remove(0, length + 1);
        (void)link().pty.read();
    }
    while (link().processor.isCommandPending()) {
        handle("\xFE");
        (void)link().pty.read();
    }
    return 0;
}
