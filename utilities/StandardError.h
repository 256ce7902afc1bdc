// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

namespace Utilities
{

/// Standard error, which nobody may read: a pipe that is full, or a console that has been stopped, holds up whoever
/// writes to it. The program writes a lot there: the log's echo, Qt's debug output (`qDebug` and its kin, most of it
/// from the GUI thread), and what libraries have to say of a missing sound card.
///
/// Threads: any may write; `keepFromBlocking()` is for the program's start, before there are others.
class StandardError
{
public:
    StandardError() = delete;

    /// From now on no thread waits for the reader of standard error. Qt's messages go through the log's writer
    /// (`LogWriter`), in their order with the log's echo and within its bounds; their text is Qt's own, and so is what
    /// Qt makes of a fatal one. What others write themselves is lost when it does not fit, for the descriptor no longer
    /// blocks: the process gets a way of its own into the pipe or terminal, and other processes keep theirs as it was.
    /// Files never hold anybody up and stay as they are, and so does a socket.
    static void keepFromBlocking();
};

} // namespace Utilities
