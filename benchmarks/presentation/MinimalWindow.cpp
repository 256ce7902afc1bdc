// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include <QApplication>
#include <QLabel>
#include <QTimer>

#include <array>

/// The least that a Qt program with such a window does: eight framed labels, all re-coloured by style sheet once a
/// second. The test window is measured beside it.
int main(int argc, char** argv)
{
    const QApplication application(argc, argv);
    QWidget window;
    window.setGeometry(0, 0, 240, 320);
    std::array<QLabel*, 8> labels{};
    for (std::size_t index = 0; index < labels.size(); ++index) {
        labels[index] = new QLabel(QStringLiteral("Label %1").arg(index), &window);
        labels[index]->setGeometry(0, static_cast<int>(index) * 40, 240, 30);
        labels[index]->setFrameShape(QFrame::Box);
        labels[index]->setAlignment(Qt::AlignCenter);
    }
    bool isGreen = false;
    const auto recolour = [&] {
        isGreen = !isGreen;
        for (auto* const label : labels)
            label->setStyleSheet(isGreen ? QStringLiteral("background-color: green;")
                                         : QStringLiteral("background-color: red;"));
    };
    recolour();
    QTimer timer;
    QObject::connect(&timer, &QTimer::timeout, &window, recolour);
    timer.start(1000);
    window.show();
    return QApplication::exec();
}
