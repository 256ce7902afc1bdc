// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/audio/MixerState.h"

#include <alsa/asoundlib.h>
#include <alsa/control_external.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <memory>

// A sound card for a program that sets its volume, without a sound card: an external control of the ALSA library, which
// keeps what is written to it in a state file (see MixerState.h). A program gets it through the file that the
// environment variable ALSA_CONFIG_PATH names:
//
//     ctl_type.immunityrig { lib "/.../libMixerPlugin.so" }
//     ctl.default { type immunityrig state "/.../mixer" }
//
// The card has two controls, and its last is the volume, as on the device: "Master Playback Switch" (one boolean, on
// for good) and "PCM Playback Volume" (two integers, left and right, 0 to 60). A write beyond the range fails with
// EINVAL and changes nothing.
//
// Threads: like any ALSA control, one thread at a time for a handle; several handles and processes may share the file.

namespace
{

using VirtualDevice::MixerState;

struct Control
{
    const char* name;
    int type;
    unsigned int channels;
    unsigned int access;
};

constexpr std::array controls{
    Control{"Master Playback Switch", SND_CTL_ELEM_TYPE_BOOLEAN, 1, SND_CTL_EXT_ACCESS_READ},
    Control{"PCM Playback Volume", SND_CTL_ELEM_TYPE_INTEGER, 2, SND_CTL_EXT_ACCESS_READWRITE},
};
constexpr snd_ctl_ext_key_t volumeKey = 1;

struct Card
{
    snd_ctl_ext_t ext{};
    std::string statePath;
};

Card& cardOf(snd_ctl_ext_t* ext)
{
    return *static_cast<Card*>(ext->private_data);
}

void closeCard(snd_ctl_ext_t* ext)
{
    delete static_cast<Card*>(ext->private_data);
}

int elementCount(snd_ctl_ext_t* /*ext*/)
{
    return static_cast<int>(controls.size());
}

int elementAt(snd_ctl_ext_t* /*ext*/, unsigned int offset, snd_ctl_elem_id_t* id)
{
    if (offset >= controls.size())
        return -EINVAL;
    snd_ctl_elem_id_set_interface(id, SND_CTL_ELEM_IFACE_MIXER);
    snd_ctl_elem_id_set_name(id, controls.at(offset).name);
    return 0;
}

snd_ctl_ext_key_t findElement(snd_ctl_ext_t* /*ext*/, const snd_ctl_elem_id_t* id)
{
    const unsigned int number = snd_ctl_elem_id_get_numid(id);
    if (number > 0)
        return number <= controls.size() ? number - 1 : SND_CTL_EXT_KEY_NOT_FOUND;
    for (snd_ctl_ext_key_t key = 0; key < controls.size(); ++key)
        if (std::strcmp(snd_ctl_elem_id_get_name(id), controls.at(key).name) == 0)
            return key;
    return SND_CTL_EXT_KEY_NOT_FOUND;
}

int attributeOf(snd_ctl_ext_t* /*ext*/, snd_ctl_ext_key_t key, int* type, unsigned int* access, unsigned int* count)
{
    const Control& control = controls.at(key);
    *type = control.type;
    *access = control.access;
    *count = control.channels;
    return 0;
}

int integerRangeOf(snd_ctl_ext_t* /*ext*/, snd_ctl_ext_key_t key, long* minimum, long* maximum, long* step)
{
    *minimum = key == volumeKey ? MixerState::minimum : 0;
    *maximum = key == volumeKey ? MixerState::maximum : 1;
    *step = 1;
    return 0;
}

int readIntegers(snd_ctl_ext_t* ext, snd_ctl_ext_key_t key, long* values)
{
    if (key != volumeKey) {
        values[0] = 1;
        return 0;
    }
    const auto state = MixerState::read(cardOf(ext).statePath).value_or(MixerState());
    values[0] = state.left;
    values[1] = state.right;
    return 0;
}

/// 1 for a change, 0 for none, as the control interface wants it.
int writeIntegers(snd_ctl_ext_t* ext, snd_ctl_ext_key_t key, long* values)
{
    if (key != volumeKey)
        return -EPERM;
    for (const long value : {values[0], values[1]})
        if (value < MixerState::minimum || value > MixerState::maximum)
            return -EINVAL;
    auto state = MixerState::read(cardOf(ext).statePath).value_or(MixerState());
    const bool isChange = state.left != values[0] || state.right != values[1];
    state = {values[0], values[1], state.writes + 1};
    if (!state.write(cardOf(ext).statePath))
        return -EIO;
    return isChange ? 1 : 0;
}

int noEvent(snd_ctl_ext_t* /*ext*/, snd_ctl_elem_id_t* /*id*/, unsigned int* /*mask*/)
{
    return -EAGAIN;
}

snd_ctl_ext_callback_t callbacks()
{
    snd_ctl_ext_callback_t table{};
    table.close = closeCard;
    table.elem_count = elementCount;
    table.elem_list = elementAt;
    table.find_elem = findElement;
    table.get_attribute = attributeOf;
    table.get_integer_info = integerRangeOf;
    table.read_integer = readIntegers;
    table.write_integer = writeIntegers;
    table.read_event = noEvent;
    return table;
}

template <std::size_t size> void copyText(char (&destination)[size], const char* text)
{
    std::strncpy(destination, text, size - 1);
}

/// The "state" of the card's entry in the configuration file.
int stateOf(snd_config_t* entry, std::string& path)
{
    snd_config_t* value = nullptr;
    const char* text = nullptr;
    if (snd_config_search(entry, "state", &value) < 0 || snd_config_get_string(value, &text) < 0)
        return -EINVAL;
    path = text;
    return 0;
}

} // namespace

extern "C" {

SND_CTL_PLUGIN_DEFINE_FUNC(immunityrig);

SND_CTL_PLUGIN_DEFINE_FUNC(immunityrig)
{
    static_cast<void>(root);
    static const snd_ctl_ext_callback_t table = callbacks();
    auto card = std::make_unique<Card>();
    if (const int error = stateOf(conf, card->statePath); error < 0)
        return error;
    card->ext.version = SND_CTL_EXT_VERSION;
    copyText(card->ext.id, "ImmunityRig");
    copyText(card->ext.driver, "ImmunityRig");
    copyText(card->ext.name, "Virtual device");
    copyText(card->ext.longname, "The virtual device's sound card");
    copyText(card->ext.mixername, "Virtual device");
    card->ext.poll_fd = -1;
    card->ext.callback = &table;
    card->ext.private_data = card.get();
    const int error = snd_ctl_ext_create(&card->ext, name, mode);
    if (error < 0)
        return error;
    // From here on the handle owns the card and destroys it in its close callback.
    *handlep = card.release()->ext.handle;
    return 0;
}

SND_CTL_PLUGIN_SYMBOL(immunityrig)
}
