// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QJsonObject>
#include <QJsonValue>
#include <QString>

#include <variant>

namespace VirtualDevice::JsonRpc
{

/// The messages of the control socket: JSON-RPC 2.0 with parameters by name, one message a line, no batches.
///
/// | code   | meaning                                                        |
/// |--------|----------------------------------------------------------------|
/// | -32700 | the line is no JSON                                            |
/// | -32600 | it is JSON, but no request, or longer than a line may be       |
/// | -32601 | no such method; the text names those that there are            |
/// | -32602 | a parameter is missing, unknown or out of range; the text says |
/// | -32000 | a wait that did not come true in its time                      |
/// | -32001 | not now: the screen is not connected, or too many waits        |
///
/// Threads: no state; any thread.
enum class ErrorCode
{
    ParseError = -32700,
    InvalidRequest = -32600,
    MethodNotFound = -32601,
    InvalidParams = -32602,
    TimedOut = -32000,
    Unavailable = -32001,
};

struct Error
{
    ErrorCode code = ErrorCode::InvalidRequest;
    QString message;
    QJsonValue data = QJsonValue::Undefined;
};

struct Request
{
    QJsonValue id = QJsonValue::Undefined; ///< undefined: a notification, which gets no answer
    QString method;
    QJsonObject params;
};

/// What is wrong with a line, and the identity to answer it under (null when the line shows none).
struct Refusal
{
    QJsonValue id;
    Error error;
};

[[nodiscard]] std::variant<Request, Refusal> parseRequest(const QByteArray& line);

// Each returns the whole line with its end.
[[nodiscard]] QByteArray requestLine(const QJsonValue& id, const QString& method, const QJsonObject& params);
[[nodiscard]] QByteArray resultLine(const QJsonValue& id, const QJsonValue& result);
[[nodiscard]] QByteArray errorLine(const QJsonValue& id, const Error& error);
[[nodiscard]] QByteArray notificationLine(const QString& method, const QJsonObject& params);

} // namespace VirtualDevice::JsonRpc
