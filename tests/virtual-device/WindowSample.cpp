// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

// A window with the test window's regions and nothing behind them, for the tests of the screen: it runs under Qt's own
// VNC server, lights the label of a held key, and changes its status colours at the keys G, R and W. Every key event
// goes to standard output as "press CODE" or "release CODE".

#include <QApplication>
#include <QGridLayout>
#include <QHBoxLayout>
#include <QKeyEvent>
#include <QLabel>
#include <QSlider>
#include <QVBoxLayout>
#include <QWidget>

#include <array>
#include <cstdio>

namespace
{

struct KeyLabel
{
    int key;
    const char* name;
    const char* text;
};

constexpr std::array keyLabels{
    KeyLabel{Qt::Key_F5, "soft1Label", "Soft1"},  KeyLabel{Qt::Key_F6, "soft2Label", "Soft2"},
    KeyLabel{Qt::Key_F7, "soft3Label", "Soft3"},  KeyLabel{Qt::Key_Return, "selLabel", "Sel"},
    KeyLabel{Qt::Key_Up, "upLabel", "Up"},        KeyLabel{Qt::Key_Down, "downLabel", "Down"},
    KeyLabel{Qt::Key_Left, "leftLabel", "Left"},  KeyLabel{Qt::Key_Right, "rightLabel", "Right"},
    KeyLabel{Qt::Key_F12, "powerLabel", "Power"},
};

QLabel* addLabel(QWidget* parent, const char* name, const QString& text, const QString& style, const QRect& place = {})
{
    auto* label = new QLabel(text, parent);
    label->setObjectName(name);
    label->setFrameShape(QFrame::Box);
    label->setAlignment(Qt::AlignCenter);
    label->setStyleSheet(style);
    if (place.isValid())
        label->setGeometry(place);
    return label;
}

class Window : public QWidget
{
public:
    Window()
    {
        setObjectName("TestGui");
        resize(240, 320);
        status("hidDevice", "HID Device", {0, 94, 120, 25});
        status("hidGadget", "HID Gadget", {120, 94, 120, 25});
        status("trigger", "Trigger", {0, 220, 120, 18});
        status("sdCard", "SD Card", {120, 220, 120, 18});
        buildKeys();
        buildRadio();
        grabKeyboard();
    }

protected:
    void keyPressEvent(QKeyEvent* event) override { handle(event->key(), true); }
    void keyReleaseEvent(QKeyEvent* event) override { handle(event->key(), false); }

private:
    void status(const char* name, const QString& text, const QRect& place)
    {
        statusLabels.append(addLabel(this, name, text, "background-color: red;", place));
    }

    void buildKeys()
    {
        auto* panel = new QWidget(this);
        panel->setGeometry(0, 32, 240, 62);
        auto* box = new QWidget(panel);
        box->setGeometry(0, 0, 231, 61);
        auto* grid = new QGridLayout(box);
        grid->setContentsMargins(0, 0, 0, 0);
        int index = 0;
        for (const auto& key : keyLabels) {
            grid->addWidget(keyLabel(box, key), index / 4, index % 4);
            ++index;
        }
        unknown = addLabel(box, "unknownLabel", "Unknown:", {});
        unknown->setFont(QFont("DejaVu Sans"));
        grid->addWidget(unknown, 2, 1, 1, 3);
    }

    QLabel* keyLabel(QWidget* parent, const KeyLabel& key)
    {
        auto* label = addLabel(parent, key.name, key.text, "background-color: white;");
        label->setFont(QFont("DejaVu Sans"));
        return label;
    }

    void buildRadio()
    {
        auto* panel = new QWidget(this);
        panel->setGeometry(0, 237, 240, 83);
        auto* columns = new QHBoxLayout(panel);
        auto* left = new QVBoxLayout;
        auto* right = new QVBoxLayout;
        columns->addLayout(left);
        columns->addLayout(right);
        addSlider(panel, left, "Frequency", "2402 MHz");
        addSlider(panel, left, "Power", "-18 dBm");
        auto* transmitting = new QLabel("| ) ) )", panel);
        transmitting->setObjectName("labelTransmitting");
        transmitting->setFont(QFont(QString(), 12, QFont::Bold));
        right->addWidget(transmitting);
        statusLabels.append(addLabel(panel, "labelBeacon", "Beacon Micro", "background-color: red;"));
        right->addWidget(statusLabels.back());
        statusLabels.append(addLabel(panel, "labelRadios", "Internal RF", "background-color: red;"));
        right->addWidget(statusLabels.back());
    }

    static void addSlider(QWidget* panel, QVBoxLayout* column, const QString& name, const QString& value)
    {
        auto* row = new QHBoxLayout;
        row->addWidget(new QLabel(name, panel));
        row->addWidget(addLabel(panel, "value", value, {}));
        column->addLayout(row);
        column->addWidget(new QSlider(Qt::Horizontal, panel));
    }

    void handle(int key, bool pressed)
    {
        std::printf("%s %d\n", pressed ? "press" : "release", key);
        std::fflush(stdout);
        const QString colour = pressed ? "background-color: green;" : "background-color: white;";
        for (const auto& row : keyLabels)
            if (row.key == key)
                findChild<QLabel*>(row.name)->setStyleSheet(colour);
        if (pressed && (key == Qt::Key_G || key == Qt::Key_R || key == Qt::Key_W))
            for (auto* label : std::as_const(statusLabels))
                label->setStyleSheet(key == Qt::Key_G   ? "background-color: green;"
                                     : key == Qt::Key_R ? "background-color: red;"
                                                        : "background-color: white;");
    }

    QList<QLabel*> statusLabels;
    QLabel* unknown = nullptr;
};

} // namespace

int main(int argc, char** argv)
{
    const QApplication application(argc, argv);
    Window window;
    window.show();
    if (application.arguments().contains("--geometry")) {
        QApplication::processEvents();
        for (const auto* child : window.findChildren<QWidget*>()) {
            const QPoint corner = child->mapTo(&window, QPoint());
            std::printf("%s %d %d %d %d\n", qPrintable(child->objectName()), corner.x(), corner.y(), child->width(),
                        child->height());
        }
        return 0;
    }
    std::puts("ready");
    std::fflush(stdout);
    return QApplication::exec();
}
