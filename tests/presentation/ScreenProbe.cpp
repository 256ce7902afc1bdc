// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include <QFile>
#include <QFont>
#include <QGenericPlugin>
#include <QGuiApplication>
#include <QLibraryInfo>
#include <QTimer>
#include <QWindow>

#include <syslog.h>

namespace
{

QByteArray sizeOf(const char* resource)
{
    return QByteArray::number(QFile(QString::fromLatin1(resource)).size());
}

/// Closes the window, as the user of a desktop would, after writing down what the framebuffer's plugin and the layouts
/// go by, and what is compiled into the program. The end of the window goes to the log.
void lookAt(QWindow& window)
{
    QObject::connect(&window, &QObject::destroyed, [] { syslog(LOG_USER | LOG_INFO, "window destroyed"); });
    QFile report(QStringLiteral("/mnt/screen-probe.part"));
    if (!report.open(QIODevice::WriteOnly))
        qFatal("no place for the report");
    report.write("QT_QPA_FB_FORCE_FULLSCREEN=" + qgetenv("QT_QPA_FB_FORCE_FULLSCREEN") + '\n');
    report.write("QT_FONT_DPI=" + qgetenv("QT_FONT_DPI") + '\n');
    report.write("points=" + QByteArray::number(QGuiApplication::font().pointSizeF()) + '\n');
    report.write("configuration=" + sizeOf(":/qt/etc/qt.conf") + '\n');
    report.write("sound=" + sizeOf(":/sounds/TestSound.wav") + '\n');
    report.write("prefix=" + QLibraryInfo::path(QLibraryInfo::PrefixPath).toUtf8() + '\n');
    report.write("closed=" + QByteArray::number(int(window.close())) + '\n');
    report.close();
    report.rename(QStringLiteral("/mnt/screen-probe"));
}

} // namespace

/// Runs inside the shipped program (QT_QPA_GENERIC_PLUGINS=screenprobe) and sees what nobody outside can.
class ScreenProbe : public QGenericPlugin
{
    Q_OBJECT
    Q_PLUGIN_METADATA(IID QGenericPluginFactoryInterface_iid FILE "ScreenProbe.json")

public:
    QObject* create(const QString& /*key*/, const QString& /*parameters*/) override
    {
        auto* const timer = new QTimer;
        connect(timer, &QTimer::timeout, timer, [timer] {
            for (auto* const window : QGuiApplication::topLevelWindows()) {
                if (!window->isExposed())
                    continue;
                timer->stop();
                lookAt(*window);
                return;
            }
        });
        timer->start(20);
        return timer;
    }
};

#include "ScreenProbe.moc"
