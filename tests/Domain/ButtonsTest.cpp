// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Buttons.h"

#include "DataSource/src/XmlConfigurationData.h"
#include "tests/support/LoggedTexts.h"

#include <QApplication>
#include <QFile>
#include <QKeyEvent>
#include <QLineEdit>
#include <QMetaMethod>
#include <QTemporaryDir>
#include <QTest>
#include <QWindow>

using DataSource::AbstractConfigurationData;
using DataSource::XmlConfigurationData;
using Domain::AbstractButtons;
using Domain::Buttons;
using TestSupport::LogCapture;
using TestSupport::loggedTexts;

namespace
{

/// Names of the signals in the order of their emission.
class Recorder
{
public:
    explicit Recorder(AbstractButtons& buttons)
    {
        using Signal = void (AbstractButtons::*)();
        const std::pair<Signal, const char*> all[]{
            {&AbstractButtons::soft1Pressed, "soft1"},  {&AbstractButtons::soft2Pressed, "soft2"},
            {&AbstractButtons::soft3Pressed, "soft3"},  {&AbstractButtons::powerPressed, "power"},
            {&AbstractButtons::upPressed, "up"},        {&AbstractButtons::downPressed, "down"},
            {&AbstractButtons::leftPressed, "left"},    {&AbstractButtons::rightPressed, "right"},
            {&AbstractButtons::enterPressed, "enter"},  {&AbstractButtons::anyButtonPressed, "any"},
            {&AbstractButtons::dspAssert, "dspAssert"},
        };
        for (const auto& [signal, name] : all)
            QObject::connect(&buttons, signal, &buttons, [this, text = QString(name)] { seen.append(text); });
    }

    QStringList take() { return std::exchange(seen, {}); }

private:
    QStringList seen;
};

/// What happens to windows other than `known`, and whether the keyboard was grabbed by then.
class WindowWatcher : public QObject
{
public:
    explicit WindowWatcher(QWidget* known) : except(known) { qApp->installEventFilter(this); }

    QStringList seen;

protected:
    bool eventFilter(QObject* object, QEvent* event) override
    {
        const bool shown = event->type() == QEvent::Show;
        if ((shown || event->type() == QEvent::Hide) && object->isWidgetType() && object != except)
            seen.append(QStringLiteral("%1, %2").arg(shown ? "show" : "hide",
                                                     QWidget::keyboardGrabber() == nullptr ? "no grab" : "grabbed"));
        return false;
    }

private:
    QWidget* except;
};

} // namespace

class ButtonsTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();

    void signalsAreDeclaredInOrder();
    void keysEmitTheirSignals_data();
    void keysEmitTheirSignals();
    void keysReachTheButtonsWhateverHasTheFocus();
    void theInvisibleWindowStaysHidden();
    void theInvisibleWindowIsShownThenHiddenThenGrabs();
    void destructionReleasesTheKeyboard();
    void heldDownKeyRepeats();
    void powerFiresOnTheThirdRepeatOnly();
    void powerCountsAnewAfterAFreshPress();
    void freshPowerPressResetsTheCountWhileSignalsAreDisabled();
    void unknownKeyIsLoggedOnce();
    void keyEventsGoNoFurther();
    void releasesAreNotHandled();
    void disabledIndividualSignalsLeaveAnyButtonOnly();
    void theLockDoesNotSilenceKeys();
    void lockOnAFreshConfigurationIsStoredAsTrue();
    void settingTheStoredLockDoesNotRewriteTheFile();
    void clearingALockThatWasNeverStoredWritesNothing();
    void readingTheLockStoresFalseOnAFreshConfiguration();
    void lockSurvivesARestart();

private:
    /// As the windowing system delivers it to the window that has the focus.
    void send(QEvent::Type type, int key, bool isRepeat = false) const;
    void press(int key) const { send(QEvent::KeyPress, key); }
    void repeat(int key) const { send(QEvent::KeyPress, key, true); }
    [[nodiscard]] QByteArray content() const;

    std::unique_ptr<QTemporaryDir> directory;
    std::unique_ptr<LogCapture> log;
    std::unique_ptr<XmlConfigurationData> configuration;
    std::unique_ptr<QLineEdit> focused;
    std::unique_ptr<Buttons> buttons;
    std::unique_ptr<Recorder> recorder;
};

void ButtonsTest::init()
{
    directory = std::make_unique<QTemporaryDir>();
    log = std::make_unique<LogCapture>();
    configuration = std::make_unique<XmlConfigurationData>(directory->filePath("configuration"));
    focused = std::make_unique<QLineEdit>();
    buttons = std::make_unique<Buttons>(*configuration);
    recorder = std::make_unique<Recorder>(*buttons);
    focused->show();
    QVERIFY(QTest::qWaitForWindowActive(focused.get()));
    loggedTexts(*log);
}

void ButtonsTest::cleanup()
{
    buttons.reset();
    recorder.reset();
    focused.reset();
    configuration.reset();
    log.reset();
    directory.reset();
}

void ButtonsTest::send(QEvent::Type type, int key, bool isRepeat) const
{
    QKeyEvent event(type, key, Qt::NoModifier, QString(), isRepeat);
    QCoreApplication::sendEvent(focused->windowHandle(), &event);
}

QByteArray ButtonsTest::content() const
{
    QFile file(directory->filePath("configuration"));
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray("(none)");
}

void ButtonsTest::signalsAreDeclaredInOrder()
{
    const QMetaObject& meta = AbstractButtons::staticMetaObject;
    QStringList names;
    for (int index = meta.methodOffset(); index < meta.methodCount(); ++index) {
        QCOMPARE(meta.method(index).methodType(), QMetaMethod::Signal);
        names.append(meta.method(index).methodSignature());
    }
    QCOMPARE(names, (QStringList{"soft1Pressed()", "soft2Pressed()", "soft3Pressed()", "powerPressed()", "upPressed()",
                                 "downPressed()", "leftPressed()", "rightPressed()", "enterPressed()",
                                 "anyButtonPressed()", "dspAssert()"}));
    QCOMPARE(Buttons::staticMetaObject.methodCount(), Buttons::staticMetaObject.methodOffset());
}

void ButtonsTest::keysEmitTheirSignals_data()
{
    QTest::addColumn<int>("code");
    QTest::addColumn<QString>("signal");
    QTest::addColumn<bool>("repeats");
    QTest::addRow("Return") << 0x01000004 << "enter" << false;
    QTest::addRow("Left") << 0x01000012 << "left" << true;
    QTest::addRow("Up") << 0x01000013 << "up" << true;
    QTest::addRow("Right") << 0x01000014 << "right" << true;
    QTest::addRow("Down") << 0x01000015 << "down" << true;
    QTest::addRow("F5") << 0x01000034 << "soft1" << false;
    QTest::addRow("F6") << 0x01000035 << "soft2" << false;
    QTest::addRow("F7") << 0x01000036 << "soft3" << false;
    QTest::addRow("F11") << 0x0100003A << "dspAssert" << false;
}

void ButtonsTest::keysEmitTheirSignals()
{
    QFETCH(const int, code);
    QFETCH(const QString, signal);
    QFETCH(const bool, repeats);
    press(code);
    QCOMPARE(recorder->take(), (QStringList{signal, "any"}));
    repeat(code);
    QCOMPARE(recorder->take(), repeats ? (QStringList{signal, "any"}) : QStringList{"any"});
    QCOMPARE(loggedTexts(*log), QStringList());
}

void ButtonsTest::keysReachTheButtonsWhateverHasTheFocus()
{
    QTest::keyClick(focused->windowHandle(), Qt::Key_Up);
    QCOMPARE(recorder->take(), (QStringList{"up", "any"}));
    QTest::keyClick(focused->windowHandle(), Qt::Key_A);
    QCOMPARE(focused->text(), QString());
}

void ButtonsTest::theInvisibleWindowStaysHidden()
{
    QVERIFY(QWidget::keyboardGrabber() != nullptr);
    QVERIFY(QWidget::keyboardGrabber()->isHidden());
    QVERIFY(QWidget::keyboardGrabber()->isWindow());
}

void ButtonsTest::theInvisibleWindowIsShownThenHiddenThenGrabs()
{
    recorder.reset();
    buttons.reset();
    const WindowWatcher watcher(focused.get());
    buttons = std::make_unique<Buttons>(*configuration);
    QCOMPARE(watcher.seen, (QStringList{"show, no grab", "hide, no grab"}));
    QVERIFY(QWidget::keyboardGrabber() != nullptr);
}

void ButtonsTest::destructionReleasesTheKeyboard()
{
    buttons.reset();
    QVERIFY(QWidget::keyboardGrabber() == nullptr);
}

void ButtonsTest::heldDownKeyRepeats()
{
    press(Qt::Key_Down);
    repeat(Qt::Key_Down);
    repeat(Qt::Key_Down);
    QCOMPARE(recorder->take(), (QStringList{"down", "any", "down", "any", "down", "any"}));
}

void ButtonsTest::powerFiresOnTheThirdRepeatOnly()
{
    press(Qt::Key_F12);
    repeat(Qt::Key_F12);
    repeat(Qt::Key_F12);
    QCOMPARE(recorder->take(), (QStringList{"any", "any", "any"}));
    repeat(Qt::Key_F12);
    QCOMPARE(recorder->take(), (QStringList{"power", "any"}));
    for (int extra = 0; extra < 20; ++extra) {
        repeat(Qt::Key_F12);
        QCOMPARE(recorder->take(), QStringList{"any"});
    }
}

void ButtonsTest::powerCountsAnewAfterAFreshPress()
{
    press(Qt::Key_F12);
    repeat(Qt::Key_F12);
    repeat(Qt::Key_F12);
    send(QEvent::KeyRelease, Qt::Key_F12);
    press(Qt::Key_F12);
    repeat(Qt::Key_F12);
    repeat(Qt::Key_F12);
    QVERIFY(!recorder->take().contains("power"));
    repeat(Qt::Key_F12);
    QCOMPARE(recorder->take(), (QStringList{"power", "any"}));
}

void ButtonsTest::freshPowerPressResetsTheCountWhileSignalsAreDisabled()
{
    press(Qt::Key_F12);
    repeat(Qt::Key_F12);
    repeat(Qt::Key_F12);
    buttons->enableIndividualSignals(false);
    press(Qt::Key_F12);
    buttons->enableIndividualSignals(true);
    recorder->take();
    repeat(Qt::Key_F12);
    repeat(Qt::Key_F12);
    QCOMPARE(recorder->take(), (QStringList{"any", "any"}));
    repeat(Qt::Key_F12);
    QCOMPARE(recorder->take(), (QStringList{"power", "any"}));
}

void ButtonsTest::unknownKeyIsLoggedOnce()
{
    press(Qt::Key_A);
    QCOMPARE(loggedTexts(*log), QStringList{"Domain/src/DomainLayer/Buttons.cpp, 146, Unknown key pressed : 65"});
    QCOMPARE(recorder->take(), QStringList{"any"});
    repeat(Qt::Key_A);
    QCOMPARE(recorder->take(), QStringList{"any"});
    QCOMPARE(loggedTexts(*log), QStringList());
}

void ButtonsTest::keyEventsGoNoFurther()
{
    for (const int key : {int(Qt::Key_Return), int(Qt::Key_F12), int(Qt::Key_A)}) {
        QKeyEvent event(QEvent::KeyPress, key, Qt::NoModifier);
        QCoreApplication::sendEvent(QWidget::keyboardGrabber(), &event);
        QVERIFY(event.isAccepted());
    }
}

void ButtonsTest::releasesAreNotHandled()
{
    for (const int key : {int(Qt::Key_Return), int(Qt::Key_F12), int(Qt::Key_A)})
        send(QEvent::KeyRelease, key);
    QCOMPARE(recorder->take(), QStringList());
    QCOMPARE(loggedTexts(*log), QStringList());
}

void ButtonsTest::disabledIndividualSignalsLeaveAnyButtonOnly()
{
    buttons->enableIndividualSignals(false);
    const QList<int> keys{Qt::Key_Return, Qt::Key_Left, Qt::Key_F5,  Qt::Key_F6, Qt::Key_F7,
                          Qt::Key_F11,    Qt::Key_F12,  Qt::Key_Tab, Qt::Key_A};
    for (const int key : keys) {
        press(key);
        for (int count = 0; count < 4; ++count)
            repeat(key);
    }
    QCOMPARE(recorder->take(), QStringList(keys.size() * 5, "any"));
    QCOMPARE(loggedTexts(*log), QStringList());
}

void ButtonsTest::theLockDoesNotSilenceKeys()
{
    buttons->setButtonLock(true);
    press(Qt::Key_F5);
    QCOMPARE(recorder->take(), (QStringList{"soft1", "any"}));
}

void ButtonsTest::lockOnAFreshConfigurationIsStoredAsTrue()
{
    buttons->setButtonLock(true);
    QVERIFY(content().contains("<ButtonLock>true</ButtonLock>"));
    QCOMPARE(configuration->data(AbstractConfigurationData::ButtonLock), QVariant(true));
    QVERIFY(buttons->buttonsLocked());
}

void ButtonsTest::settingTheStoredLockDoesNotRewriteTheFile()
{
    buttons->setButtonLock(true);
    QVERIFY(QFile::remove(directory->filePath("configuration")));
    buttons->setButtonLock(true);
    QCOMPARE(content(), QByteArray("(none)"));
    buttons->setButtonLock(false);
    QVERIFY(content().contains("<ButtonLock>false</ButtonLock>"));
    QVERIFY(!buttons->buttonsLocked());
}

void ButtonsTest::clearingALockThatWasNeverStoredWritesNothing()
{
    buttons->setButtonLock(false);
    QCOMPARE(content(), QByteArray("(none)"));
    QVERIFY(!configuration->data(AbstractConfigurationData::ButtonLock).isValid());
}

void ButtonsTest::readingTheLockStoresFalseOnAFreshConfiguration()
{
    QVERIFY(!buttons->buttonsLocked());
    QVERIFY(content().contains("<ButtonLock>false</ButtonLock>"));
}

void ButtonsTest::lockSurvivesARestart()
{
    buttons->setButtonLock(true);
    buttons.reset();
    configuration = std::make_unique<XmlConfigurationData>(directory->filePath("configuration"));
    buttons = std::make_unique<Buttons>(*configuration);
    QVERIFY(buttons->buttonsLocked());
}

QTEST_MAIN(ButtonsTest)
#include "ButtonsTest.moc"
