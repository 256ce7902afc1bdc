// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QThread>

#include <atomic>
#include <memory>

/// A model of the virtual device in a thread of its own, as it is in a process of its own when the program runs: a
/// caller that blocks the test's thread does not block the model.
template <typename Model> class ModelThread
{
public:
    template <typename... Arguments> explicit ModelThread(Arguments&... arguments)
    {
        context.moveToThread(&thread);
        thread.start();
        call([&] { model = std::make_unique<Model>(arguments...); });
    }
    ~ModelThread()
    {
        call([this] { model.reset(); });
        thread.quit();
        thread.wait();
    }
    ModelThread(const ModelThread&) = delete;
    ModelThread& operator=(const ModelThread&) = delete;

    /// Runs in the model's thread and waits.
    template <typename Function> void call(Function function)
    {
        ++handedOver;
        QMetaObject::invokeMethod(
            &context,
            [this, &function] {
                ++handedOver;
                function();
                ++handedOver;
            },
            Qt::BlockingQueuedConnection);
        ++handedOver;
    }
    [[nodiscard]] Model& operator*() { return *model; }
    [[nodiscard]] Model* operator->() { return model.get(); }

private:
    /// Orders the two threads before and after a call where the thread sanitizer sees it: Qt's own wait is hidden to
    /// it.
    std::atomic<int> handedOver = 0;
    QThread thread;
    QObject context;
    std::unique_ptr<Model> model;
};
