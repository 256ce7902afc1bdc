// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/JsonRpc.h"

#include <QJsonDocument>

namespace VirtualDevice::JsonRpc
{

namespace
{

const QString versionKey = QStringLiteral("jsonrpc");
const QString version = QStringLiteral("2.0");

QByteArray lineOf(QJsonObject message)
{
    message.insert(versionKey, version);
    return QJsonDocument(message).toJson(QJsonDocument::Compact) + '\n';
}

Refusal refused(const QJsonValue& id, ErrorCode code, const QString& message)
{
    return {id, {code, message, QJsonValue::Undefined}};
}

bool isIdentity(const QJsonValue& id)
{
    return id.isUndefined() || id.isNull() || id.isString() || id.isDouble();
}

std::variant<Request, Refusal> checked(const QJsonObject& message)
{
    const QJsonValue id = message.value("id");
    const QJsonValue method = message.value("method");
    const QJsonValue params = message.value("params");
    const QJsonValue answerTo = isIdentity(id) && !id.isUndefined() ? id : QJsonValue();
    if (!isIdentity(id))
        return refused(answerTo, ErrorCode::InvalidRequest, "\"id\" must be a number, a string or null");
    if (message.value(versionKey) != version)
        return refused(answerTo, ErrorCode::InvalidRequest, R"("jsonrpc" must be "2.0")");
    if (!method.isString())
        return refused(answerTo, ErrorCode::InvalidRequest, "\"method\" must be a string");
    if (!params.isUndefined() && !params.isObject())
        return refused(answerTo, ErrorCode::InvalidParams, "\"params\" must be an object");
    return Request{id, method.toString(), params.toObject()};
}

} // namespace

std::variant<Request, Refusal> parseRequest(const QByteArray& line)
{
    QJsonParseError error;
    const auto document = QJsonDocument::fromJson(line, &error);
    if (error.error != QJsonParseError::NoError)
        return refused({}, ErrorCode::ParseError, QStringLiteral("no JSON: %1").arg(error.errorString()));
    if (!document.isObject())
        return refused({}, ErrorCode::InvalidRequest, "a message is one JSON object on one line");
    return checked(document.object());
}

QByteArray requestLine(const QJsonValue& id, const QString& method, const QJsonObject& params)
{
    return lineOf({{"id", id}, {"method", method}, {"params", params}});
}

QByteArray resultLine(const QJsonValue& id, const QJsonValue& result)
{
    return lineOf({{"id", id}, {"result", result}});
}

QByteArray errorLine(const QJsonValue& id, const Error& error)
{
    QJsonObject body{{"code", static_cast<int>(error.code)}, {"message", error.message}};
    if (!error.data.isUndefined())
        body.insert("data", error.data);
    return lineOf({{"id", id}, {"error", body}});
}

QByteArray notificationLine(const QString& method, const QJsonObject& params)
{
    return lineOf({{"method", method}, {"params", params}});
}

} // namespace VirtualDevice::JsonRpc
