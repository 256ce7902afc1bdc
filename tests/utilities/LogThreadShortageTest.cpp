// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/LogCapture.h"
#include "utilities/Debug.h"

#include <QTest>

#include <dlfcn.h>
#include <pthread.h>

#include <atomic>
#include <cerrno>

namespace
{

std::atomic<bool> hasThreads = true;
std::atomic<int> refused = 0;
std::atomic<int> started = 0;

} // namespace

extern "C" int pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*start)(void*),
                              void* argument)
{
    using Function = int (*)(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*);
    static const auto real = reinterpret_cast<Function>(::dlsym(RTLD_NEXT, "pthread_create"));
    if (hasThreads) {
        ++started;
        return real(thread, attributes, start, argument);
    }
    ++refused;
    return EAGAIN;
}

/// The log on a machine that has no thread left for its writer, at first.
class LogThreadShortageTest : public QObject
{
    Q_OBJECT

private slots:
    void whatIsLoggedComesAllTheSame()
    {
        hasThreads = false;
        Utilities::Debug::info(QStringLiteral("before anybody listens"));
        hasThreads = true;
        QCOMPARE(refused.load(), 1);
        const int before = started;
        Utilities::Debug::info(QStringLiteral("with threads again"));
        QCOMPARE(started - before, 1);
        const TestSupport::LogCapture log;
        Utilities::Debug::info(QStringLiteral("first"));
        Utilities::Debug::debugBrief(QStringLiteral("second"));
        QVERIFY(log.waitFor(QStringLiteral("second")));
        QCOMPARE(log.texts(), (QStringList{QStringLiteral("first"), QStringLiteral("second")}));
    }
};

QTEST_GUILESS_MAIN(LogThreadShortageTest)
#include "LogThreadShortageTest.moc"
