// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QWidget>

#include <memory>

namespace Presentation
{

/// Shows voltage (V, from the gauge's microvolts) and current (mA, from microamperes; negative while discharging) of
/// the battery, read once a second. A reading that is no number shows as 0; one that cannot be opened leaves what was
/// shown.
///
/// Lives in the GUI thread, which the reads block. Problems go to the debug output (each text ends in a blank).
/// The paths are relative: the program runs in the root directory.
class FuelGuageTest : public QWidget
{
    Q_OBJECT

public:
    explicit FuelGuageTest(QWidget* parent);
    ~FuelGuageTest() override;

    void start();
    void stop();

private slots:
    void checkGauge();

private:
    struct PrivateData;
    const std::unique_ptr<PrivateData> d;
};

} // namespace Presentation
