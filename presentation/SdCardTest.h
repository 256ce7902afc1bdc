// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QWidget>

#include <memory>

namespace Presentation
{

/// Green while the SD card is present and the probe file on its data partition reads as it was written; checked once a
/// second. The probe file is written when there is none, and only then.
///
/// Lives in the GUI thread, which the file operations block.
class SdCardTest : public QWidget
{
    Q_OBJECT

public:
    explicit SdCardTest(QWidget* parent);
    ~SdCardTest() override;

    void start();
    void stop();

private slots:
    void checkConnected();

private:
    struct PrivateData;
    const std::unique_ptr<PrivateData> d;
};

} // namespace Presentation
