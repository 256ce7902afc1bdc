// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QColor>
#include <QObject>
#include <QPointer>
#include <QString>
#include <QTimer>
#include <QWidget>

#include <vector>

namespace TestSupport
{

/// Sees the timers of a test without a way in of its own: keeps every QTimer without a parent that fires while it
/// lives.
class TimerProbe : public QObject
{
    Q_OBJECT

public:
    TimerProbe();

    /// In the order of their first firing.
    [[nodiscard]] std::vector<QTimer*> timers() const;
    [[nodiscard]] int firings(const QTimer* timer) const;
    /// The only timer that fires, once it has; null when there is none within 20 seconds.
    [[nodiscard]] QTimer* waitForTimer() const;

    bool eventFilter(QObject* receiver, QEvent* event) override;

private:
    struct Seen
    {
        QPointer<QTimer> timer;
        int firings;
    };
    std::vector<Seen> seen;
};

/// Counts the paint events of a widget and of everything in it.
class PaintCounter : public QObject
{
    Q_OBJECT

public:
    explicit PaintCounter(QWidget& widget);

    int paints = 0;

    bool eventFilter(QObject* receiver, QEvent* event) override;
};

/// Handles what is under way until nothing of the widget is painted any more.
void paintWhatIsUnderWay(QWidget& widget);

/// The child of that name and type; the test ends when there is none.
template <typename Type> Type& child(QObject& parent, const char* name)
{
    auto* const found = parent.findChild<Type*>(QString::fromLatin1(name));
    if (found == nullptr)
        qFatal("no %s of that type", name);
    return *found;
}

/// The colour that the widget paints two pixels inside its frame.
[[nodiscard]] QColor paintedColour(QWidget& widget);

/// Writes a file of the sandbox, with the folders above it. The file is kept in place: only its content changes.
void writeFile(const QString& path, const QByteArray& content);
[[nodiscard]] QByteArray readFile(const QString& path);
/// How many bytes this process has read so far, from whatever.
[[nodiscard]] qint64 bytesRead();
/// A file of eight megabytes without a line end: larger than what any region may read at a time.
void writeEndlessLine(const QString& path, const QByteArray& begin);
inline constexpr qint64 mostRead = 5 << 20;
inline constexpr qint64 mostReadOfAWord = 64 << 10; ///< where a word or two decide, and by chance other files are read
/// Removes a file, a link or a folder with everything in it.
void removePath(const QString& path);

} // namespace TestSupport
