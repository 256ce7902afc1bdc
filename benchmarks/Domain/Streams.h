// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>

namespace Benchmarks
{

/// What the radio microcontroller's line may carry, good and bad.
enum class Content
{
    Payloads1,
    Payloads10,
    Payloads46,
    Payloads100,
    PayloadsMixed,
    PayloadsMixedAltered,
    Zeros,
    Random,
    StartBytes,
    WrongDataChecksums
};

constexpr Content allContents[] = {
    Content::Payloads1,     Content::Payloads10,           Content::Payloads46, Content::Payloads100,
    Content::PayloadsMixed, Content::PayloadsMixedAltered, Content::Zeros,      Content::Random,
    Content::StartBytes,    Content::WrongDataChecksums};

[[nodiscard]] QByteArray makeStream(Content content, qsizetype size);
[[nodiscard]] const char* nameOf(Content content);

} // namespace Benchmarks
