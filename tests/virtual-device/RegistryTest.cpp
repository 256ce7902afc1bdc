// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/registry/Registry.h"

#include "virtual-device/control/ControlDescription.h"
#include "virtual-device/registry/ControlTable.h"
#include "virtual-device/screen/RegionMap.h"

#include <QJsonArray>
#include <QRegularExpression>
#include <QSet>
#include <QSignalSpy>
#include <QTest>

#include <thread>
#include <vector>

using namespace VirtualDevice;

namespace
{

QString fromView(std::string_view view)
{
    return QString::fromUtf8(view.data(), static_cast<qsizetype>(view.size()));
}

} // namespace

class RegistryTest : public QObject
{
    Q_OBJECT

private slots:
    void namesAreUniqueAndWellFormed();
    void everyDefaultIsWhatTheControlTakes();
    void everyControlSaysWhatItIs();
    void everyControlBeginsWithItsDefault();
    void operatorsDoorRefusesWhatTheTableForbids();
    void readOnlyControlIsPublishedButNotSet();
    void changeIsSignalledOnceForEachNewValue();
    void wordsOfTheCommandLineBecomeValues();
    void countLosesNoConcurrentStep();

    void describedRowHasEveryColumn();
    void markdownPageListsEveryControlOnce();
    void markdownPageShowsDefaultsAndUnitsAsTheDeviceDoes();
    void markdownPageListsEveryRegionOnce();
};

void RegistryTest::namesAreUniqueAndWellFormed()
{
    static const QRegularExpression form("\\A[a-z0-9_]+(\\.[a-z0-9_]+)+\\z");
    QSet<QString> names;
    for (const auto& spec : controlTable()) {
        const QString name = fromView(spec.name);
        QVERIFY2(form.match(name).hasMatch(), qPrintable(name));
        QVERIFY2(!names.contains(name), qPrintable(name));
        names.insert(name);
        QCOMPARE(Registry::find(name), &spec);
    }
    QVERIFY(!names.isEmpty());
    QCOMPARE(Registry::find("battery"), nullptr);
    QCOMPARE(Registry::find(""), nullptr);
}

void RegistryTest::everyDefaultIsWhatTheControlTakes()
{
    for (const auto& spec : controlTable()) {
        const QJsonValue initial = Registry::parsed(spec, fromView(spec.initial));
        QVERIFY2(Registry::accepts(spec, initial), spec.name.data());
        QVERIFY2(spec.type == ControlType::Choice || spec.minimum < spec.maximum, spec.name.data());
        QVERIFY2(spec.type != ControlType::Choice || !spec.choices.empty(), spec.name.data());
    }
}

void RegistryTest::everyControlSaysWhatItIs()
{
    for (const auto& spec : controlTable()) {
        QVERIFY2(!spec.help.empty(), spec.name.data());
        QVERIFY2(!fromView(spec.help).contains(u'\n'), spec.name.data());
        QVERIFY2(!Registry::allowed(spec).isEmpty(), spec.name.data());
    }
}

void RegistryTest::everyControlBeginsWithItsDefault()
{
    const Registry registry;
    for (const auto& spec : controlTable())
        QCOMPARE(registry.value(fromView(spec.name)), Registry::parsed(spec, fromView(spec.initial)));
}

void RegistryTest::operatorsDoorRefusesWhatTheTableForbids()
{
    Registry registry;
    QSignalSpy changes(&registry, &Registry::changed);
    const QString range = "control \"battery.voltage\" takes -2147483648..2147483647 uV";
    QCOMPARE(registry.set("battery.voltage", 2147483648.0), range);
    QCOMPARE(registry.set("battery.voltage", -2147483649.0), range);
    QCOMPARE(registry.set("battery.voltage", 0.5), range);
    QCOMPARE(registry.set("battery.voltage", "1"), range);
    QCOMPARE(registry.set("battery.voltage", true), range);
    QCOMPARE(registry.set("battery.voltage", QJsonValue()), range);
    QCOMPARE(registry.set("battery", 1), "unknown control \"battery\"");
    QCOMPARE(changes.count(), 0);
    QCOMPARE(registry.set("battery.voltage", 2147483647), std::nullopt);
    QCOMPARE(registry.set("battery.voltage", -2147483648.0), std::nullopt);
    QCOMPARE(registry.integer("battery.voltage"), -2147483648LL);
}

void RegistryTest::readOnlyControlIsPublishedButNotSet()
{
    Registry registry;
    QCOMPARE(registry.set("led.power_latch", 1), "control \"led.power_latch\" is read only");
    registry.publish("led.power_latch", 1);
    QCOMPARE(registry.integer("led.power_latch"), 1);
}

void RegistryTest::changeIsSignalledOnceForEachNewValue()
{
    Registry registry;
    QSignalSpy changes(&registry, &Registry::changed);
    QCOMPARE(registry.set("battery.voltage", 5), std::nullopt);
    QCOMPARE(registry.set("battery.voltage", 5), std::nullopt);
    registry.publish("battery.voltage", 6);
    QCOMPARE(changes.count(), 2);
    QCOMPARE(changes.at(0), (QVariantList{"battery.voltage", QVariant::fromValue(QJsonValue(5))}));
    QCOMPARE(changes.at(1), (QVariantList{"battery.voltage", QVariant::fromValue(QJsonValue(6))}));
}

void RegistryTest::wordsOfTheCommandLineBecomeValues()
{
    constexpr auto number = integerControl("a.b", "", -5, 5, "0", "h");
    constexpr auto flag = switchControl("a.b", "true", "h");
    constexpr auto choice = choiceControl("a.b", "x|y", "x", "h");
    constexpr auto text = textControl("a.b", 3, "", "h");
    QCOMPARE(Registry::parsed(number, "-5"), QJsonValue(-5));
    QCOMPARE(Registry::parsed(number, "five"), QJsonValue());
    QCOMPARE(Registry::parsed(flag, "off"), QJsonValue(false));
    QCOMPARE(Registry::parsed(flag, "1"), QJsonValue(true));
    QCOMPARE(Registry::parsed(flag, "maybe"), QJsonValue());
    QVERIFY(Registry::accepts(choice, "y"));
    QVERIFY(!Registry::accepts(choice, "x|y"));
    QVERIFY(Registry::accepts(text, "abc"));
    QVERIFY(!Registry::accepts(text, "abcd"));
    QVERIFY(Registry::accepts(flag, false));
    QVERIFY(!Registry::accepts(flag, 0));
    QCOMPARE(Registry::allowed(flag), "true or false");
    QCOMPARE(Registry::allowed(choice), "x|y");
    QCOMPARE(Registry::allowed(text), "text of at most 3 characters");
    QCOMPARE(Registry::allowed(number), "-5..5");
}

void RegistryTest::countLosesNoConcurrentStep()
{
    constexpr int threadCount = 4;
    constexpr int steps = 2000;
    Registry registry;
    registry.publish("battery.voltage", 0);
    std::vector<std::thread> threads;
    for (int index = 0; index < threadCount; ++index)
        threads.emplace_back([&] {
            for (int step = 0; step < steps; ++step)
                registry.count("battery.voltage");
        });
    for (auto& thread : threads)
        thread.join();
    QCOMPARE(registry.integer("battery.voltage"), threadCount * steps);
}

void RegistryTest::describedRowHasEveryColumn()
{
    constexpr auto choice = reported(choiceControl("a.b", "x|y", "y", "what it is"));
    QCOMPARE(ControlDescription::object(choice), (QJsonObject{{"name", "a.b"},
                                                              {"type", "choice"},
                                                              {"unit", ""},
                                                              {"access", "device"},
                                                              {"default", "y"},
                                                              {"allowed", "x|y"},
                                                              {"choices", QJsonArray{"x", "y"}},
                                                              {"help", "what it is"}}));
}

void RegistryTest::markdownPageListsEveryControlOnce()
{
    const QString page = ControlDescription::markdown();
    for (const auto& spec : controlTable())
        QCOMPARE(page.count(QStringLiteral("\n| `%1` | ").arg(fromView(spec.name))), 1);
    QVERIFY(page.startsWith("# Controls of the virtual device\n"));
    QVERIFY(page.contains("| `battery.voltage` | -2147483648..2147483647 uV | `4100000` | what the fuel gauge"));
}

/// One notation for what is taken and what is shown, and the unit of what is only shown.
void RegistryTest::markdownPageShowsDefaultsAndUnitsAsTheDeviceDoes()
{
    const QString page = ControlDescription::markdown();
    for (const auto& spec : controlTable()) {
        const bool isSwitch = spec.type == ControlType::Boolean;
        QVERIFY2(!isSwitch || spec.initial == "true" || spec.initial == "false", spec.name.data());
    }
    QVERIFY(page.contains("| `usb.hid` | true or false | `true` | "));
    QVERIFY(page.contains("| `radio.frequency` | read only, MHz | `0` | "));
    QVERIFY(page.contains("| `rtc.time` | 0..4102444799 s | the host's time | "));
    QVERIFY(page.contains("| `radio.text` | text of at most 99 characters | empty | "));
}

void RegistryTest::markdownPageListsEveryRegionOnce()
{
    const QString page = ControlDescription::markdown();
    for (const auto& region : RegionMap::regions())
        QCOMPARE(page.count(QStringLiteral("\n| `%1` | ").arg(fromView(region.name))), 1);
    QVERIFY(page.contains("\n| `sd-card` | 120, 220, 120, 18 | green while the card"));
    QVERIFY(page.contains("Colours: none, green, red, white, other."));
}

QTEST_GUILESS_MAIN(RegistryTest)
#include "RegistryTest.moc"
