// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/registry/ControlTable.h"

#include <array>

namespace VirtualDevice
{

namespace
{

/// What every file of the tree can be made to answer: ENOENT takes the entry away, EACCES refuses to open it, the
/// others fail the reading, writing or asking.
constexpr std::string_view fileFaults = "none|EIO|ENODATA|ENOENT|EACCES";
/// A link can also stay behind when what it names has gone.
constexpr std::string_view linkFaults = "none|dangling|EIO|ENODATA|ENOENT|EACCES";
/// What a file holds instead of its value.
constexpr std::string_view contents = "normal|empty|binary|huge|no-newline";

constexpr std::int64_t lowest32 = -2'147'483'648;
constexpr std::int64_t highest32 = 2'147'483'647;
constexpr std::int64_t endOf2099 = 4'102'444'799;
constexpr std::int64_t plenty = 1'000'000'000'000;
constexpr std::int64_t hour = 3'600'000; ///< in ms

constexpr std::array controls{
    // Fuel gauge
    integerControl("battery.voltage", "uV", lowest32, highest32, "4100000", "what the fuel gauge measures"),
    integerControl("battery.current", "uA", lowest32, highest32, "-123456",
                   "what the fuel gauge measures; negative while the battery discharges"),
    choiceControl("battery.voltage_content", contents, "normal", "what the voltage file holds in place of the value"),
    choiceControl("battery.current_content", contents, "normal", "what the current file holds in place of the value"),
    choiceControl("battery.voltage_fault", fileFaults, "none", "how the voltage file fails"),
    choiceControl("battery.current_fault", fileFaults, "none", "how the current file fails"),

    // Real-time clock
    startingWith("the host's time", integerControl("rtc.time", "s", 0, endOf2099, "0",
                                                   "seconds since 1970-01-01 UTC; the clock runs on from what is set")),
    switchControl("rtc.running", "true", "false stops the clock"),
    choiceControl("rtc.fault", "none|EIO|ENODATA|EINVAL|ENOENT|EACCES|garbage", "none",
                  "how reading the clock fails; garbage answers with nonsense, ENOENT and EACCES refuse to open it"),

    // USB
    switchControl("usb.hid", "true", "a HID device is plugged in at 1-1.4"),
    choiceControl("usb.hid_fault", linkFaults, "none", "how the entry of the HID device fails"),
    switchControl("usb.gadget", "true", "a host is connected: the controller is a peripheral"),
    choiceControl("usb.gadget_content", contents, "normal", "what the mode file holds in place of the mode"),
    choiceControl("usb.gadget_fault", fileFaults, "none", "how the mode file fails"),

    // SD card
    switchControl("sd.present", "true", "the card's block device exists; its mounted partition stays either way"),
    choiceControl("sd.block_fault", linkFaults, "none", "how the entry of the card's block device fails"),
    switchControl("sd.readonly", "false", "the data partition refuses every change"),
    switchControl("sd.full", "false", "the data partition has no room left"),
    choiceControl("sd.fault", fileFaults, "none", "how everything on the data partition fails"),

    // Signal lines
    integerControl("trigger.period", "ms", 0, hour, "500", "a trigger (F10) arrives this often; 0 = never"),
    integerControl("radioline.period", "ms", 0, hour, "1000", "the radio line (F11) is raised this often; 0 = never"),
    reported(integerControl("led.power_latch", "", 0, 255, "0", "the power latch; the program never clears it")),
    reported(integerControl("led.writes", "", 0, plenty, "0", "how often the power latch was written")),
    reported(textControl("led.written", 64, "", "when the power latch was last written")),
    choiceControl("led.fault", fileFaults, "none", "how the power latch's file fails"),
    reported(integerControl("reset_line.writes", "", 0, plenty, "0", "how often the radio's reset line was pulsed")),
    reported(textControl("reset_line.written", 64, "", "when the radio's reset line was last pulsed")),
    choiceControl("reset_line.fault", fileFaults, "none", "how the reset line's file fails"),

    // System log
    switchControl("log.stalled", "false", "the log service stops reading, so that its queue fills"),

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
    reported(integerControl("radio.packets", "", 0, plenty, "0", "packets transmitted")),
    reported(integerControl("radio.frame_pulses", "", 0, plenty, "0", "times the frame pulse line was toggled")),
    reported(integerControl("radio.accel_mode", "", 0, 255, "0", "accelerometer mode")),
    reported(integerControl("radio.accel_frames", "", 0, plenty, "0", "accelerometer frames sent")),
    reported(integerControl("radio.resets", "", 0, plenty, "0", "pulses on the reset line")),
    reported(integerControl("radio.pings", "", 0, plenty, "0", "pings carried out")),
    reported(integerControl("radio.commands", "", 0, plenty, "0", "commands received")),
    reported(textControl("radio.last_command", 200, "", "the last command received, hexadecimal")),
    reported(integerControl("radio.frames_good", "", 0, plenty, "0", "frames received whole")),
    reported(integerControl("radio.frames_bad", "", 0, plenty, "0", "stretches of the line that were no frame")),
    reported(integerControl("radio.frames_sent", "", 0, plenty, "0", "frames sent, before any damage")),
    reported(integerControl("radio.bytes_lost", "", 0, plenty, "0", "bytes that a full line or an absent reader lost")),
    reported(integerControl("radio.violations", "", 0, plenty, "0", "times the program broke the rules of the line")),
    reported(textControl("radio.last_violation", 200, "", "what the program did wrong last")),

    // The DSP behind /dev/dsplink.
    choiceControl("dsp.presence", "present|missing|refusing", "present",
                  "whether the device exists; missing must be set before the start, a change while the program runs "
                  "ends its connection, refusing turns the next one away"),
    choiceControl("dsp.refuse", "none|attach|queue|load|start|transport|locate|transport-close|stop|queue-close|detach",
                  "none", "the request that fails"),
    switchControl("dsp.replies", "true",
                  "false: no request is carried out or answered, as if the DSP were dead behind a link that stands"),
    choiceControl("dsp.locate", "found|late|never|missing", "found",
                  "how the search for the firmware's queue is answered; late: after dsp.ack_delay"),
    choiceControl(
        "dsp.ack", "on|nak|late|off|short|wrong-id|lost", "on",
        "how a command is answered; nak: refused, late: after dsp.ack_delay, off: neither answered nor carried "
        "out, short: a byte too short, wrong-id: in a message of id 101, lost: carried out and not answered"),
    integerControl("dsp.ack_delay", "ms", 0, 60'000, "1000", "how late an answer comes with late"),
    textControl("dsp.version", 7, "2.1", "firmware version, MAJOR.MINOR, each 0 to 255"),
    choiceControl("dsp.version_reply", "on|off|short", "on", "how a request for the version is answered"),
    integerControl("dsp.message_id", "", 0, 65'535, "100", "id of every message; the program takes 100 only"),
    integerControl("dsp.length_error", "bytes", lowest32, highest32, "0",
                   "added to the length word of every message, modulo 2^32"),
    textControl("dsp.log", 2'000, "", "sends a log string; empty again when sent"),
    choiceControl("dsp.line_noise", "none|detected|quiet|empty", "none",
                  "sends a line-noise message; none again when sent"),
    textControl("dsp.start_trigger", 24, "", "sends a start trigger, FRAME TIME; empty again when sent"),
    textControl("dsp.stop_trigger", 24, "", "sends a stop trigger, FRAME TIME; empty again when sent"),
    textControl(
        "dsp.pairing_packet", 4'000, "",
        "sends a pairing packet of these hexadecimal bytes: source and destination (3 each), command (1), data"),
    textControl("dsp.message", 4'100, "", "sends any message, TYPE DATA, both hexadecimal; empty again when sent"),
    textControl("dsp.raw", 4'100, "",
                "sends a message whose words and data are these hexadecimal bytes; empty again when sent"),
    integerControl("dsp.sensor_rate", "frames a second", 0, 1'000, "0",
                   "sensor frames that the DSP forwards while its receiver is enabled"),
    integerControl("dsp.sensors", "", 0, 16, "16", "wireless sensors that are heard"),
    choiceControl("dsp.sensor_types", "0|31|mixed|invalid", "0", "mixed: even slots 0, odd slots 31; invalid: 32"),
    integerControl("dsp.sensor_ratio", "", 0, 2, "0", "upsample ratio of the frames; 0: as the program has commanded"),
    integerControl("dsp.slot_size", "bytes", 0, 4'095, "0",
                   "size of a sensor's slot; 0: 65, or 124 at ratio 2, the most that a message holds"),
    choiceControl("dsp.sensor_fault", "none|readings-length|indivisible|short", "none",
                  "what is wrong with the sensor frames"),
    reported(
        choiceControl("dsp.state", "off|attached|loaded|started|connected", "off", "how far the program has come")),
    reported(textControl("dsp.image", 4'096, "", "the firmware image that is loaded")),
    reported(
        integerControl("dsp.receiver", "", lowest32, highest32, "0", "receiver enable: 0, 1 internal, 2 external")),
    reported(integerControl("dsp.hardware_test", "", lowest32, highest32, "0", "the hardware test that runs")),
    reported(switchControl("dsp.gathering", "false", "data gathering")),
    reported(textControl("dsp.channels", 48, "", "the four channels of data gathering")),
    reported(integerControl("dsp.base_address", "", lowest32, highest32, "0", "base address of data gathering")),
    reported(switchControl("dsp.long_range_antenna", "false", "long range antenna")),
    reported(switchControl("dsp.upsampling", "false", "upsampling")),
    reported(switchControl("dsp.pairing_mode", "false", "pairing and upgrade mode")),
    reported(integerControl("dsp.pairing_parameter", "", lowest32, highest32, "0", "its parameter")),
    reported(switchControl("dsp.enabled", "false", "what the program set with its enable command")),
    reported(integerControl("dsp.trigger", "", lowest32, highest32, "0", "data gathering trigger")),
    reported(integerControl("dsp.line_noise_detection", "", lowest32, highest32, "0", "line noise detection")),
    reported(integerControl("dsp.connections", "", 0, plenty, "0", "programs that have connected")),
    reported(integerControl("dsp.requests", "", 0, plenty, "0", "requests to the driver")),
    reported(integerControl("dsp.commands", "", 0, plenty, "0", "commands received")),
    reported(textControl("dsp.last_command", 4'200, "", "the last command and its payload, hexadecimal")),
    reported(integerControl("dsp.messages_received", "", 0, plenty, "0", "messages from the program")),
    reported(integerControl("dsp.messages_sent", "", 0, plenty, "0", "messages to the program")),
    reported(integerControl("dsp.messages_lost", "", 0, plenty, "0", "messages for which there was no room")),
    reported(integerControl("dsp.sensor_frames", "", 0, plenty, "0", "sensor frames made")),
    reported(integerControl("dsp.violations", "", 0, plenty, "0", "times the program broke the rules")),
    reported(textControl("dsp.last_violation", 200, "", "what the program did wrong last")),

    // The loudspeaker and its volume control.
    choiceControl("audio.presence", "present|missing|no-output|no-mixer", "present",
                  "what of the sound card exists; read when the program's surroundings are built"),
    switchControl("audio.forget", "false",
                  "puts audio.gap_ms, audio.late_ms and audio.mismatches back to 0; false again when done"),
    reported(switchControl("audio.playing", "false", "the sound is heard")),
    reported(integerControl("audio.sounds", "", 0, plenty, "0", "times the sound began")),
    reported(integerControl("audio.buffers", "", 0, plenty, "0", "buffers of 256 ms heard, silent ones included")),
    reported(integerControl("audio.gap_ms", "ms", 0, plenty, "0", "longest silence since the first sound")),
    reported(integerControl("audio.late_ms", "ms", 0, plenty, "0", "the most that a buffer has come late since then")),
    reported(integerControl("audio.mismatches", "", 0, plenty, "0", "buffers that are not what the sound file holds")),
    reported(integerControl("audio.volume_left", "", 0, 60, "0", "what the mixer was set to")),
    reported(integerControl("audio.volume_right", "", 0, 60, "0", "what the mixer was set to")),
    reported(integerControl("audio.volume_writes", "", 0, plenty, "0", "times the mixer was set")),
};

} // namespace

std::span<const ControlSpec> controlTable()
{
    return controls;
}

} // namespace VirtualDevice
