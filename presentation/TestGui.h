// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>

#include <memory>

class QWidget;

namespace DataSource
{
class AbstractDataSourceLayer;
}

namespace Presentation
{

/// The test window: owns the device objects and the tests, builds them in a fixed order, gives each test its region of
/// the 240 by 320 pixel screen, starts it and wires it up. A device that does not answer leaves its region red and
/// never keeps the window from being built.
///
/// Lives in the GUI thread, as do all tests.
class TestGui : public QObject
{
    Q_OBJECT

public:
    /// `dataSourceLayer` holds the settings of the devices and outlives the window.
    explicit TestGui(DataSource::AbstractDataSourceLayer& dataSourceLayer, QWidget* parent = nullptr);
    ~TestGui() override;

    void show();
    void hide();

private:
    struct PrivateData;
    const std::unique_ptr<PrivateData> d;
};

} // namespace Presentation
