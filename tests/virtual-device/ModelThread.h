// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QThread>

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
        QMetaObject::invokeMethod(&context, function, Qt::BlockingQueuedConnection);
    }
    [[nodiscard]] Model& operator*() { return *model; }
    [[nodiscard]] Model* operator->() { return model.get(); }

private:
    QThread thread;
    QObject context;
    std::unique_ptr<Model> model;
};
