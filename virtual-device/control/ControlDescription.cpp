// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/ControlDescription.h"

#include "virtual-device/registry/ControlTable.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/registry/Values.h"

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

QString takes(const ControlSpec& spec)
{
    return spec.access == ControlAccess::Device ? QStringLiteral("read only") : Registry::allowed(spec);
}

QString escapedForTable(QString text)
{
    return text.replace(u'|', QStringLiteral("\\|"));
}

/// Roff takes a leading dot or apostrophe for a request and a backslash for an escape.
QString escapedForManual(QString text)
{
    text.replace(u'\\', QStringLiteral("\\e"));
    return text.startsWith(u'.') || text.startsWith(u'\'') ? QStringLiteral("\\&") + text : text;
}

QString markdownRow(const ControlSpec& spec)
{
    const QString initial = fromView(spec.initial);
    return QStringLiteral("| `%1` | %2 | %3 | %4 |\n")
        .arg(fromView(spec.name), escapedForTable(takes(spec)),
             initial.isEmpty() ? QString() : QStringLiteral("`%1`").arg(escapedForTable(initial)),
             escapedForTable(fromView(spec.help)));
}

QString json()
{
    QJsonArray rows;
    for (const auto& spec : controlTable())
        rows.append(ControlDescription::object(spec));
    return QString::fromUtf8(QJsonDocument(rows).toJson());
}

} // namespace

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
    QString page = QStringLiteral("# Controls of the virtual device\n\n"
                                  "<!-- Made by `virtual-device controls --markdown`: change the control table, not "
                                  "this page. -->\n\n"
                                  "`virtual-device ctl get NAME` shows a control, `virtual-device ctl set NAME VALUE` "
                                  "changes it while the program runs. What is read only is reported by the device.\n");
    QString group;
    for (const auto& spec : controlTable()) {
        if (groupOf(spec) != group) {
            group = groupOf(spec);
            page +=
                QStringLiteral("\n## %1\n\n| control | takes | default | meaning |\n|---|---|---|---|\n").arg(group);
        }
        page += markdownRow(spec);
    }
    return page;
}

QString ControlDescription::manual()
{
    QString list = QStringLiteral(".Bl -tag -width Ds\n");
    for (const auto& spec : controlTable())
        list += QStringLiteral(".It Cm %1\n%2.\nTakes %3; default %4.\n")
                    .arg(fromView(spec.name), escapedForManual(fromView(spec.help)), escapedForManual(takes(spec)),
                         spec.initial.empty() ? QStringLiteral("empty") : fromView(spec.initial));
    return list + QStringLiteral(".El\n");
}

QString ControlDescription::text()
{
    QString lines;
    for (const auto& spec : controlTable())
        lines += QStringLiteral("%1\n    %2\n    takes %3; default %4\n")
                     .arg(fromView(spec.name), fromView(spec.help), takes(spec),
                          spec.initial.empty() ? QStringLiteral("empty") : fromView(spec.initial));
    return lines;
}

int ControlDescription::run(const QStringList& arguments)
{
    QCommandLineParser parser;
    parser.setApplicationDescription("Prints every control of the virtual device: what it is, what it takes.");
    parser.addHelpOption();
    parser.addOptions({{"markdown", "as the page docs/controls.md"},
                       {"man", "as a list of a manual page"},
                       {"json", "for machines"}});
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
    else if (parser.isSet("man"))
        output << manual();
    else if (parser.isSet("json"))
        output << json();
    else
        output << text();
    return 0;
}

} // namespace VirtualDevice
