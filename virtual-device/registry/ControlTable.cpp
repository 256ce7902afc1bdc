// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/registry/ControlTable.h"

#include <array>

namespace VirtualDevice
{

namespace
{

constexpr std::array controls{
    integerControl("battery.voltage", "uV", -2'147'483'648, 2'147'483'647, "4100000", "what the fuel gauge measures"),
    integerControl("battery.current", "uA", -2'147'483'648, 2'147'483'647, "-123456",
                   "what the fuel gauge measures; negative while the battery discharges"),

    // The radio microcontroller on the serial line.
    choiceControl("radio.presence", "present|missing", "present",
                  "whether the serial device exists; read when the program's surroundings are built"),
    choiceControl("radio.line", "connected|unplugged|hung-up", "connected",
                  "unplugged loses every byte until it is connected again; hung-up closes the terminal under the "
                  "program, and connected then makes a new one for the next start"),
    integerControl("radio.line_seed", "", 0, 4'294'967'295, "1", "starts the line's random damage anew from this seed"),
    choiceControl("radio.ack", "on|off|nak|late|wrong-length|lost", "on",
                  "how a command is answered; off: neither answered nor carried out, nak: refused, late: after "
                  "radio.ack_delay, wrong-length: one byte too long, lost: carried out and not acknowledged"),
    integerControl("radio.ack_delay", "ms", 0, 60'000, "1000", "how late an acknowledgement comes with radio.ack late"),
    integerControl("radio.nak_code", "", 0, 255, "0", "the data byte of the refusal with radio.ack nak"),
    choiceControl("radio.reply", "on|off|wrong-length", "on",
                  "what follows the acknowledgement of a command that has a reply"),
    textControl("radio.version", 7, "1.5", "firmware version, MAJOR.MINOR, each 0 to 255"),
    integerControl("radio.check", "", 0, 255, "0", "result of the radio's self-check; above 3 is out of range"),
    textControl("radio.text", 99, "", "sends the text to the program; empty again when sent"),
    textControl("radio.message", 400, "",
                "sends a message of these hexadecimal bytes in a frame; empty again when sent"),
    textControl("radio.raw", 20'000, "", "puts these hexadecimal bytes on the line as they are; empty again when sent"),
    integerControl("radio.accel_rate", "frames a second", 0, 400, "0", "accelerometer frames that the radio sends"),
    integerControl("radio.to_program.drop", "per 100000 bytes", 0, 100'000, "0",
                   "bytes lost on the way to the program"),
    integerControl("radio.to_program.insert", "per 100000 bytes", 0, 100'000, "0",
                   "random bytes slipped in on the way to the program"),
    integerControl("radio.to_program.flip", "per 100000 bytes", 0, 100'000, "0",
                   "bytes with a flipped bit on the way to the program"),
    integerControl("radio.to_program.duplicate", "per 100000 bytes", 0, 100'000, "0",
                   "bytes doubled on the way to the program"),
    choiceControl("radio.to_program.delivery", "natural|split|merge", "natural",
                  "how bytes come in at the program: as the line gives them, in pieces of 1 to 3 a millisecond apart, "
                  "or gathered for 100 ms"),
    integerControl("radio.to_program.burst", "bytes", 0, 65'536, "0",
                   "sends so many random bytes to the program; back to 0 when sent, unless burst_every repeats it"),
    integerControl("radio.to_program.burst_every", "ms", 0, 3'600'000, "0", "repeats the burst; 0 sends it once"),
    integerControl("radio.to_radio.drop", "per 100000 bytes", 0, 100'000, "0", "bytes lost on the way to the radio"),
    integerControl("radio.to_radio.insert", "per 100000 bytes", 0, 100'000, "0",
                   "random bytes slipped in on the way to the radio"),
    integerControl("radio.to_radio.flip", "per 100000 bytes", 0, 100'000, "0",
                   "bytes with a flipped bit on the way to the radio"),
    integerControl("radio.to_radio.duplicate", "per 100000 bytes", 0, 100'000, "0",
                   "bytes doubled on the way to the radio"),
    choiceControl("radio.to_radio.delivery", "natural|split|merge", "natural",
                  "how bytes come in at the radio: as the line gives them, in pieces of 1 to 3 a millisecond apart, or "
                  "gathered for 100 ms"),
    integerControl("radio.to_radio.burst", "bytes", 0, 65'536, "0",
                   "sends so many random bytes to the radio; back to 0 when sent, unless burst_every repeats it"),
    integerControl("radio.to_radio.burst_every", "ms", 0, 3'600'000, "0", "repeats the burst; 0 sends it once"),
    reported(textControl("radio.device", 64, "", "the terminal behind the program's serial port; empty while hung up")),
    reported(integerControl("radio.channel", "", 0, 255, "0", "channel of the RF test; 0 before the first")),
    reported(integerControl("radio.frequency", "MHz", 0, 2'655, "0", "2400 + radio.channel; 0 before the first")),
    reported(integerControl("radio.power_level", "", 0, 255, "0", "0 to 3 for -18, -12, -6 and 0 dBm")),
    reported(switchControl("radio.amplifier", "false", "power amplifier on")),
    reported(switchControl("radio.transmitting", "false", "RF test packets are being sent")),
    reported(switchControl("radio.beacon", "false", "the beacon is being sent")),
    reported(textControl("radio.beacon_address", 6, "", "hexadecimal")),
    reported(textControl("radio.beacon_channels", 32, "", "the beacon's four channels")),
    reported(textControl("radio.beacon_packets", 20, "", "the beacon's packets, hexadecimal")),
    reported(textControl("radio.packet", 80, "", "address, channel, option and data of the last packet, hexadecimal")),
    reported(integerControl("radio.packets", "", 0, INT64_MAX, "0", "packets transmitted")),
    reported(integerControl("radio.frame_pulses", "", 0, INT64_MAX, "0", "times the frame pulse line was toggled")),
    reported(integerControl("radio.accel_mode", "", 0, 255, "0", "accelerometer mode")),
    reported(integerControl("radio.accel_frames", "", 0, INT64_MAX, "0", "accelerometer frames sent")),
    reported(integerControl("radio.resets", "", 0, INT64_MAX, "0", "pulses on the reset line")),
    reported(integerControl("radio.pings", "", 0, INT64_MAX, "0", "pings carried out")),
    reported(integerControl("radio.commands", "", 0, INT64_MAX, "0", "commands received")),
    reported(textControl("radio.last_command", 200, "", "the last command received, hexadecimal")),
    reported(integerControl("radio.frames_good", "", 0, INT64_MAX, "0", "frames received whole")),
    reported(integerControl("radio.frames_bad", "", 0, INT64_MAX, "0", "stretches of the line that were no frame")),
    reported(integerControl("radio.frames_sent", "", 0, INT64_MAX, "0", "frames sent, before any damage")),
    reported(
        integerControl("radio.bytes_lost", "", 0, INT64_MAX, "0", "bytes that a full line or an absent reader lost")),
    reported(
        integerControl("radio.violations", "", 0, INT64_MAX, "0", "times the program broke the rules of the line")),
    reported(textControl("radio.last_violation", 200, "", "what the program did wrong last")),
};

} // namespace

std::span<const ControlSpec> controlTable()
{
    return controls;
}

} // namespace VirtualDevice
