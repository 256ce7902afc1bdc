// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/audio/SoundMatcher.h"

#include <QtEndian>

#include <algorithm>

namespace VirtualDevice
{

namespace
{

bool isSilent(QByteArrayView bytes)
{
    return std::all_of(bytes.begin(), bytes.end(), [](char byte) { return byte == 0; });
}

/// The buffer of the sound that begins at the offset; the last one is short.
QByteArrayView bufferAt(const QByteArray& sound, qsizetype offset)
{
    return QByteArrayView(sound).sliced(offset, std::min(SoundMatcher::bufferSize, sound.size() - offset));
}

} // namespace

QByteArray wavSamples(QByteArrayView file)
{
    constexpr qsizetype riffHeader = 12;
    constexpr qsizetype chunkHeader = 8;
    if (file.size() < riffHeader || !file.startsWith("RIFF") || file.sliced(8, 4) != QByteArrayView("WAVE"))
        return {};
    for (qsizetype at = riffHeader; at + chunkHeader <= file.size();) {
        const auto size = static_cast<qsizetype>(qFromLittleEndian<quint32>(file.data() + at + 4));
        if (file.sliced(at, 4) == QByteArrayView("data"))
            return file.sliced(at + chunkHeader, std::min(size, file.size() - at - chunkHeader)).toByteArray();
        at += chunkHeader + size + size % 2; // chunks begin at even offsets
    }
    return {};
}

void SoundMatcher::setSound(const QByteArray& samples)
{
    sound = samples;
    first = 0;
    while (first < sound.size() && isSilent(bufferAt(sound, first)))
        first += bufferSize;
}

bool SoundMatcher::continuesAt(qsizetype offset, QByteArrayView buffer) const
{
    if (offset >= sound.size())
        return false;
    const QByteArrayView due = bufferAt(sound, offset);
    return buffer.first(due.size()) == due && isSilent(buffer.sliced(due.size()));
}

SoundMatcher::Judgement SoundMatcher::advanceFrom(qsizetype offset, Judgement judgement)
{
    judgement.soundBytes = std::min(bufferSize, sound.size() - offset);
    next = offset + bufferSize < sound.size() ? offset + bufferSize : 0;
    return judgement;
}

/// Where in the sound such a buffer stands; -1 for nowhere.
qsizetype SoundMatcher::placeOf(QByteArrayView buffer) const
{
    for (qsizetype offset = first; offset < sound.size(); offset += bufferSize)
        if (continuesAt(offset, buffer))
            return offset;
    return -1;
}

SoundMatcher::Judgement SoundMatcher::judge(QByteArrayView buffer)
{
    const bool silent = isSilent(buffer);
    if (next > 0 && continuesAt(next, buffer))
        return advanceFrom(next, {Verdict::Sound});
    if (silent)
        return {};
    if (continuesAt(first, buffer))
        return advanceFrom(first, {Verdict::Sound, true});
    const qsizetype place = placeOf(buffer);
    if (place >= 0) // a hole: one fault, however much is missing
        return advanceFrom(place, {Verdict::Mismatch});
    if (next > 0) // most likely what was due, damaged
        return advanceFrom(next, {Verdict::Mismatch});
    return {Verdict::Mismatch, false, buffer.size()};
}

} // namespace VirtualDevice
