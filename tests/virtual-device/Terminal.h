// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QString>

#include <fcntl.h>
#include <stdlib.h>
#include <termios.h>
#include <unistd.h>

#include <array>

namespace TestSupport
{

/// A terminal with nobody's session on it, and the person in front of it.
class Terminal
{
public:
    Terminal() : person(::posix_openpt(O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC))
    {
        ::grantpt(person);
        ::unlockpt(person);
        program = ::open(::ptsname(person), O_RDWR | O_NOCTTY | O_CLOEXEC);
    }

    ~Terminal()
    {
        ::close(program);
        ::close(person);
    }

    Terminal(const Terminal&) = delete;
    Terminal& operator=(const Terminal&) = delete;

    [[nodiscard]] bool isOpen() const { return program >= 0; }
    /// The program's end.
    [[nodiscard]] int end() const { return program; }
    [[nodiscard]] QString name() const { return QString::fromLocal8Bit(::ptsname(person)); }

    void stop() const { ::tcflow(program, TCOOFF); }
    void goOn() const { ::tcflow(program, TCOON); }

    /// Everything that was written so far.
    [[nodiscard]] QByteArray shown()
    {
        std::array<char, 4096> buffer{};
        for (ssize_t count = 0; (count = ::read(person, buffer.data(), buffer.size())) > 0;)
            text.append(buffer.data(), count);
        return text;
    }

private:
    int person;
    int program = -1;
    QByteArray text;
};

} // namespace TestSupport
