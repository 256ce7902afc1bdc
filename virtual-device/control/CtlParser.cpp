// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/CtlParser.h"

#include "virtual-device/control/ControlDescription.h"
#include "virtual-device/registry/ControlTable.h"
#include "virtual-device/registry/Values.h"
#include "virtual-device/screen/KeyTable.h"
#include "virtual-device/screen/RegionMap.h"

#include <QCommandLineParser>
#include <QRegularExpression>

#include <algorithm>
#include <array>

namespace VirtualDevice
{

namespace
{

struct Command
{
    const char* name;
    int words; ///< behind the command; -1: see `waitProblem`
    const char* usage;
    const char* help;
};

constexpr std::array commands{
    Command{"list", 0, "list", "every control, its value, and what it takes"},
    Command{"get", 1, "get NAME", "the value of a control"},
    Command{"set", 2, "set NAME VALUE", "gives a control a value"},
    Command{"press", 1, "press KEY", "presses a key, which stays down"},
    Command{"release", 1, "release KEY", "lets a key go"},
    Command{"hold", 2, "hold KEY MILLISECONDS", "presses a key, lets it go after that time, and ends"},
    Command{"screenshot", 1, "screenshot FILE.png", "the window as a PNG file"},
    Command{"regions", 0, "regions", "every region of the window and its colour"},
    Command{"log", 0, "log [--follow]", "what the program has logged; with --follow, also what comes"},
    Command{"events", 0, "events", "changes of controls and regions, log lines and what the models saw, as they come"},
    Command{"wait", -1, "wait region NAME COLOUR [--within SECONDS]", "ends when the region has the colour"},
    Command{"wait", -1, "wait control NAME VALUE [--within SECONDS]", "ends when the control has the value"},
    Command{"wait", -1, "wait log TEXT [--within SECONDS]", "ends when a line of the log contains the text"},
};

QString usageText()
{
    QString text = QStringLiteral("usage: virtual-device ctl [--device NAME] [--json] COMMAND\n\n");
    for (const auto& command : commands)
        text += QStringLiteral("  %1 %2\n").arg(QLatin1String(command.usage), -44).arg(QLatin1String(command.help));
    return text + QStringLiteral("\nA wait lasts %1 s at most unless --within says otherwise. \"ctl --help\" names the "
                                 "keys, regions and controls.\nExit status: 0 done, 1 did not come true in time, 2 "
                                 "wrong use.\n")
                      .arg(CtlRequest().within);
}

/// Every name that a command takes.
QString namesText()
{
    QString text = QStringLiteral("\nKeys, by any of their names:\n    %1\n\nColours: %2\n\nRegions:\n")
                       .arg(KeyTable::names().join(", "), RegionMap::words().join(", "));
    for (const auto& region : RegionMap::regions())
        text += QStringLiteral("    %1 %2\n").arg(fromView(region.name), -20).arg(fromView(region.help));
    text += QStringLiteral("\nControls (\"virtual-device controls\" explains them; a switch is also on or off):\n");
    for (const auto& spec : controlTable())
        text += QStringLiteral("    %1 %2\n").arg(fromView(spec.name), -28).arg(ControlDescription::takes(spec));
    return text;
}

/// Where a number begins with a minus sign the parser would look for options.
QStringList withNumbersLast(const QStringList& arguments)
{
    static const QRegularExpression negative(QStringLiteral("\\A-\\d"));
    if (arguments.contains("--"))
        return arguments;
    QStringList ordered;
    QStringList numbers;
    for (const auto& argument : arguments)
        (negative.match(argument).hasMatch() ? numbers : ordered).append(argument);
    return numbers.isEmpty() ? ordered : ordered + QStringList("--") + numbers;
}

QString waitProblem(const QStringList& words)
{
    const QString kind = words.value(0);
    const bool isComplete =
        ((kind == u"region" || kind == u"control") && words.size() == 3) || (kind == u"log" && words.size() == 2);
    return isComplete ? QString() : QStringLiteral("usage: wait region NAME COLOUR | control NAME VALUE | log TEXT");
}

QString formProblem(const CtlRequest& request)
{
    const auto* const row = std::find_if(commands.begin(), commands.end(), [&](const Command& command) {
        return request.command == QLatin1String(command.name);
    });
    if (row == commands.end()) {
        QStringList names;
        for (const auto& command : commands)
            names.append(QLatin1String(command.name));
        names.removeDuplicates();
        return QStringLiteral("unknown command \"%1\"; commands: %2").arg(request.command, names.join(", "));
    }
    if (row->words < 0)
        return waitProblem(request.words);
    return request.words.size() == row->words ? QString() : QStringLiteral("usage: %1").arg(QLatin1String(row->usage));
}

} // namespace

CtlRequest parseCtl(const QStringList& arguments)
{
    CtlRequest request;
    QCommandLineParser parser;
    parser.addOptions({{{"h", "help"}, "shows this"},
                       {"device", "the device that is meant", "NAME"},
                       {"json", "results as JSON"},
                       {"follow", "goes on with what comes"},
                       {"within", "the time limit", "SECONDS", QString::number(request.within)}});
    if (!parser.parse(QStringList("virtual-device ctl") + withNumbersLast(arguments))) {
        request.problem = parser.errorText();
        return request;
    }
    request.words = parser.positionalArguments();
    if (parser.isSet("help")) {
        request.help = usageText() + namesText();
        return request;
    }
    bool isNumber = false;
    request.within = parser.value("within").toDouble(&isNumber);
    if (request.words.isEmpty()) {
        request.problem = usageText();
        return request;
    }
    request.command = request.words.takeFirst();
    request.device = parser.value("device");
    request.isJson = parser.isSet("json");
    request.follows = parser.isSet("follow");
    request.problem = isNumber ? formProblem(request) : QStringLiteral("--within takes a number of seconds");
    return request;
}

} // namespace VirtualDevice
