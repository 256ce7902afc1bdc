// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/DataSourceLayer.h"
#include "presentation/TerminationSignals.h"
#include "presentation/TestGui.h"
#include "utilities/Debug.h"
#include "utilities/StandardError.h"

#include <QApplication>
#include <QFont>

#include <csignal>

namespace
{

/// What must stand before the application object is made.
void prepareProcess()
{
    // Nobody reading standard error any more must not end the run.
    std::signal(SIGPIPE, SIG_IGN);
    // Nor must somebody who is there and reads nothing stop it.
    Utilities::StandardError::keepFromBlocking();
    // The device's Qt configuration moves the prefix to /usr/share, where there are no plugins: the ones of the Qt that
    // the program was built with serve.
    QCoreApplication::addLibraryPath(QStringLiteral(IMMUNITYRIG_QT_PLUGINS));
    // The framebuffer plugin would stretch the window to the screen; the layout is made of pixels and stays as it is.
    qputenv("QT_QPA_FB_FORCE_FULLSCREEN", "0");
    // A point stays as many pixels as the layout was made for, whatever the display says of its size.
    qputenv("QT_FONT_DPI", "96");
}

/// The regions have room for text of this size; the toolkit's own default is larger on some platforms.
void setDefaultFont()
{
    QFont font = QApplication::font();
    font.setPointSize(9);
    QApplication::setFont(font);
}

void run(int argc, char** argv)
{
    QApplication application(argc, argv);
    // A closed window does not end the run: the log's fatal messages and the termination signals do.
    QApplication::setQuitOnLastWindowClosed(false);
    setDefaultFont();
    const Presentation::TerminationSignals terminationSignals;
    DataSource::DataSourceLayer dataSourceLayer(QStringLiteral("/"));
    Presentation::TestGui testGui(dataSourceLayer);
    testGui.show();
    QApplication::exec();
    Utilities::Debug::close();
}

} // namespace

int main(int argc, char** argv)
{
    Utilities::Debug::open();
    prepareProcess();
    Utilities::Debug::info(QStringLiteral("Starting ImmunityRig"));
    run(argc, argv);
    return 0;
}
