// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QWidget>

#include <memory>

namespace Presentation
{

/// Green while a device is plugged in at the USB position 1-1.4 (port 4 of the hub on root port 1), red while none is;
/// looked up once a second.
///
/// Lives in the GUI thread. The path is relative: the program runs in the root directory.
class UsbDeviceTest : public QWidget
{
    Q_OBJECT

public:
    explicit UsbDeviceTest(QWidget* parent);
    ~UsbDeviceTest() override;

    void start();
    void stop();

private slots:
    void checkConnect();

private:
    struct PrivateData;
    const std::unique_ptr<PrivateData> d;
};

} // namespace Presentation
