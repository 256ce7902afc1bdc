// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/ControlDescription.h"

#include "virtual-device/registry/ControlTable.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/registry/Values.h"
#include "virtual-device/screen/RegionMap.h"

#include <QCommandLineParser>
#include <QJsonArray>
#include <QJsonDocument>
#include <QTextStream>

#include <algorithm>
#include <array>

namespace VirtualDevice
{

namespace
{

QString typeWord(ControlType type)
{
    static constexpr std::array<const char*, 4> words{"integer", "boolean", "choice", "text"};
    return QString::fromLatin1(words.at(static_cast<std::size_t>(type)));
}

/// The room that a control belongs to: what is before the first dot.
QString groupOf(const ControlSpec& spec)
{
    return fromView(spec.name).section(u'.', 0, 0);
}

/// What the control is when the device starts.
QString startOf(const ControlSpec& spec)
{
    if (!spec.start.empty())
        return fromView(spec.start);
    return spec.initial.empty() ? QStringLiteral("empty") : fromView(spec.initial);
}

QString escapedForTable(QString text)
{
    return text.replace(u'|', QStringLiteral("\\|"));
}

QString markdownRow(const ControlSpec& spec)
{
    const bool isConstant = spec.start.empty() && !spec.initial.empty();
    const QString start = escapedForTable(startOf(spec));
    return QStringLiteral("| `%1` | %2 | %3 | %4 |\n")
        .arg(fromView(spec.name), escapedForTable(ControlDescription::takes(spec)),
             isConstant ? QStringLiteral("`%1`").arg(start) : start, escapedForTable(fromView(spec.help)));
}

QString regionTable()
{
    QString table = QStringLiteral("\n## Regions of the window\n\n"
                                   "`virtual-device ctl regions` shows the colour of each region, `virtual-device ctl "
                                   "wait region NAME COLOUR` waits for one. Colours: %1.\n\n"
                                   "| region | x, y, width, height | what is there |\n|---|---|---|\n")
                        .arg(RegionMap::words().join(QStringLiteral(", ")));
    for (const auto& region : RegionMap::regions())
        table += QStringLiteral("| `%1` | %2, %3, %4, %5 | %6 |\n")
                     .arg(fromView(region.name))
                     .arg(region.x)
                     .arg(region.y)
                     .arg(region.width)
                     .arg(region.height)
                     .arg(fromView(region.help));
    return table;
}

QString json()
{
    QJsonArray rows;
    for (const auto& spec : controlTable())
        rows.append(ControlDescription::object(spec));
    return QString::fromUtf8(QJsonDocument(rows).toJson());
}

} // namespace

QString ControlDescription::takes(const ControlSpec& spec)
{
    if (spec.access == ControlAccess::Operator)
        return Registry::allowed(spec);
    return spec.unit.empty() ? QStringLiteral("read only") : QStringLiteral("read only, %1").arg(fromView(spec.unit));
}

QJsonObject ControlDescription::object(const ControlSpec& spec)
{
    QJsonObject row{{"name", fromView(spec.name)},
                    {"type", typeWord(spec.type)},
                    {"unit", fromView(spec.unit)},
                    {"access", spec.access == ControlAccess::Operator ? "operator" : "device"},
                    {"default", Registry::parsed(spec, fromView(spec.initial))},
                    {"allowed", Registry::allowed(spec)},
                    {"help", fromView(spec.help)}};
    if (spec.type == ControlType::Integer) {
        row.insert("minimum", qint64(spec.minimum));
        row.insert("maximum", qint64(spec.maximum));
    }
    if (spec.type == ControlType::Choice)
        row.insert("choices", QJsonArray::fromStringList(fromView(spec.choices).split(u'|')));
    return row;
}

QString ControlDescription::markdown()
{
    QString page =
        QStringLiteral("# Controls of the virtual device\n\n"
                       "<!-- Made by `virtual-device controls --markdown`: change the control table, not "
                       "this page. -->\n\n"
                       "`virtual-device ctl get NAME` shows a control, `virtual-device ctl set NAME VALUE` "
                       "changes it while the program runs. What is read only is reported by the device. `ctl set` "
                       "and `--set` also take on and 1 for true, off and 0 for false.\n");
    QString group;
    for (const auto& spec : controlTable()) {
        if (groupOf(spec) != group) {
            group = groupOf(spec);
            page +=
                QStringLiteral("\n## %1\n\n| control | takes | default | meaning |\n|---|---|---|---|\n").arg(group);
        }
        page += markdownRow(spec);
    }
    return page + regionTable();
}

QString ControlDescription::text()
{
    QString lines;
    for (const auto& spec : controlTable())
        lines += QStringLiteral("%1\n    %2\n    takes %3; default %4\n")
                     .arg(fromView(spec.name), fromView(spec.help), ControlDescription::takes(spec), startOf(spec));
    return lines;
}

int ControlDescription::run(const QStringList& arguments)
{
    QCommandLineParser parser;
    parser.setApplicationDescription("Prints every control of the virtual device: what it is, what it takes.");
    parser.addHelpOption();
    parser.addOptions({{"markdown", "as the page docs/controls.md"}, {"json", "for machines"}});
    if (!parser.parse(QStringList("virtual-device controls") + arguments) || !parser.positionalArguments().isEmpty()) {
        QTextStream(stderr) << "virtual-device controls: "
                            << (parser.errorText().isEmpty() ? "takes no words" : parser.errorText()) << "\n";
        return 2;
    }
    QTextStream output(stdout);
    if (parser.isSet("help"))
        output << parser.helpText();
    else if (parser.isSet("markdown"))
        output << markdown();
    else if (parser.isSet("json"))
        output << json();
    else
        output << text();
    return 0;
}

} // namespace VirtualDevice
