// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QWidget>

#include <memory>

namespace Presentation
{

/// Green while the trigger input arrives at least once a second, red one second after the last trigger.
///
/// Lives in the GUI thread. Triggers count only between `start()` and `stop()`; a second that was running when the
/// test was stopped still ends in red.
class TriggerTest : public QWidget
{
    Q_OBJECT

public:
    explicit TriggerTest(QWidget* parent);
    ~TriggerTest() override;

    void start();
    void stop();

public slots:
    void triggerInput();
    void timerExpired();

private:
    struct PrivateData;
    const std::unique_ptr<PrivateData> d;
};

} // namespace Presentation
