// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QWidget>

#include <memory>

namespace Presentation
{

/// Green while the device's own USB controller is in peripheral mode, that is, attached to a host; read once a second
/// from the controller's mode file, a text of one line with its line end. The file is opened once and kept open.
///
/// Lives in the GUI thread, which the read blocks. A file that cannot be opened is told to the debug output once.
class UsbGadgetTest : public QWidget
{
    Q_OBJECT

public:
    explicit UsbGadgetTest(QWidget* parent);
    ~UsbGadgetTest() override;

    void start();
    void stop();

private slots:
    void checkConnect();

private:
    struct PrivateData;
    const std::unique_ptr<PrivateData> d;
};

} // namespace Presentation
