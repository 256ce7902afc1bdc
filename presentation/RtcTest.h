// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QWidget>

#include <memory>

namespace Presentation
{

/// Shows the date and time that the hardware clock "/dev/rtc" holds, read once a second; the field turns red with the
/// first failed read and stays red, so that a clock which failed once during a disturbance is seen afterwards.
///
/// Lives in the GUI thread, which the read blocks. Problems go to the debug output (each text ends in a blank).
/// The digits are the clock's own: no time zone is applied.
class RtcTest : public QWidget
{
    Q_OBJECT

public:
    explicit RtcTest(QWidget* parent);
    ~RtcTest() override;

    void start();
    void stop();

private slots:
    void updateTime();

private:
    struct PrivateData;
    const std::unique_ptr<PrivateData> d;
};

} // namespace Presentation
