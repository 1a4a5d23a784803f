"""The steps in order: a script in guest/steps and a check of its results."""

import dataclasses
import typing

import checks_cameras as cameras
import checks_host as host
import checks_sensors as sensors
import checks_usb as usb


@dataclasses.dataclass(frozen=True)
class Step:
    name: str  # of guest/steps/NAME.sh
    shows: str
    check: typing.Callable  # takes an Arrived; raises CheckFailed
    boot: int = 1  # the boot in which it runs
    limit: int = 60  # seconds of guest time before it counts as hung
    soak: bool = False  # with sanitizers only when it is named: it takes minutes there
    thorough: bool = False  # only with --thorough, or when it is named
    needs_vimc: bool = False  # a module that is built once, of 140 MB of sources


STEPS = [
    Step("back_cameras", "three cameras pass; their frames are as the kernel counts them", cameras.back_cameras),
    Step("front_cameras", "two cameras pass; their frames are as the kernel counts them", cameras.front_cameras),
    Step("delayed_start", "a start that is 100 ms late is an offset of 3 frames", cameras.delayed_start),
    Step("dropped_frames", "dropped frames are gaps; a camera without frames hangs nobody", cameras.dropped_frames),
    Step("refused_reqbufs", "buffers are refused: error 204", cameras.refused_start("VIDIOC_REQBUFS")),
    Step("refused_qbuf", "queueing a buffer is refused: error 204", cameras.refused_start("VIDIOC_QBUF")),
    Step("refused_streamon", "the start is refused: error 204", cameras.refused_start("VIDIOC_STREAMON")),
    Step("refused_qbuf_streaming", "queueing is refused in mid-stream: a stream error", cameras.refused_qbuf_streaming),
    Step("disconnect", "a camera disconnects in mid-stream: counted", cameras.disturbed(DisconnectCount=1)),
    Step("damaged_buffer", "a damaged buffer is counted, and is no frame", cameras.damaged_buffer),
    Step("fatal_error", "a stream breaks down: counted", cameras.disturbed(StreamErrorCount=1)),
    Step("unbind", "the driver is unbound in mid-stream, and bound again", cameras.unbind),
    Step("selftest_cameras", "the self-test finds faults that are added to a driver's calls",
         cameras.selftest_cameras),
    Step("single_camera_faults", "one camera whose clock or numbers run out; calls of its driver that are refused",
         cameras.single_camera_faults),
    Step("two_users", "a second user of a camera is refused; the first goes on", cameras.two_users),
    Step("nothing", "a machine without devices: a clear error each", host.nothing, boot=2),
    Step("simulated_phone", "the simulated phone passes on this kernel", host.simulated_phone, boot=2),
    Step("channels", "60 control groups are report channels; one raised, one missing", host.channels, boot=2),
    Step("probe", "a probe lists what is there, also without rights", host.probe, boot=2),
    Step("probed_cameras", "the cameras pass as they were probed; what is not there is skipped", host.probed_cameras,
         boot=2),
    Step("multiplanar_cameras", "the same with frames of several planes", host.multiplanar_cameras, boot=2),
    Step("projector", "frames are lit, and the light is off afterwards", cameras.projector, boot=2),
    Step("projector_unlit", "the light fails: error 206", cameras.projector_unlit, boot=2),
    Step("projector_unsafe", "the light is off for safety: error 213", cameras.projector_unsafe, boot=2),
    Step("projector_killed", "the light is off when a process is killed", cameras.projector_killed, boot=2),
    Step("sensor_30s", "60 images a second for 30 s, without loss", sensors.sensor_30s, boot=2, limit=90, soak=True),
    Step("sensor_faults", "no sensor, two, silent, refusing, removed, pausing, with long reports",
         sensors.sensor_faults, boot=2),
    Step("media_controller", "frames of vimc come through links and pads of the binding", cameras.media_controller,
         boot=2, thorough=True, needs_vimc=True),
    Step("display_off", "no images while the display is dark or unplugged", sensors.display_off, boot=2),
    Step("usb_camera", "a USB camera passes as probed; its frames are as the kernel counts them", usb.usb_camera, boot=3),
    Step("usb_cameras", "five USB cameras pass as probed, to the frame", usb.usb_cameras, boot=3),
    Step("usb_twins", "two cameras of one USB device pass", usb.usb_twins, boot=3),
    Step("usb_stalled_controls", "controls that stall are told, and never reported as set", usb.usb_stalled_controls,
         boot=3),
    Step("usb_metadata", "a USB camera's metadata belong to its frames, whoever stamps them", usb.usb_metadata, boot=3),
    Step("usb_compliance", "v4l2-compliance finds in a USB camera only what is the driver's or its own",
         usb.usb_compliance, boot=3),
    Step("usb_damaged_frames", "damaged and short frames are gaps, or buffers with errors", usb.usb_damaged_frames,
         boot=3),
    Step("usb_late_frames", "late frames, and none, are noticed", usb.usb_late_frames, boot=3),
    Step("usb_unplugged", "a USB camera is unplugged before, at the start, in and after a stream", usb.usb_unplugged,
         boot=3),
    Step("usb_projector_unplugged", "a USB camera with a projector is unplugged before, in and after a stream",
         usb.usb_projector_unplugged, boot=4),
    Step("usb_unplugged_anytime", "a USB camera is unplugged at ten moments of a stream", usb.usb_unplugged_anytime,
         boot=3, limit=120, thorough=True),
    Step("usb_60s", "two USB cameras for 60 s, without loss, as the kernel counts them", usb.usb_60s, boot=3, limit=120, soak=True, thorough=True),
    Step("usb_sensor", "a USB sensor; one that stalls, is silent, pauses, is unplugged", usb.usb_sensor, boot=4),
    Step("usb_sensor_unplugged", "a USB sensor is unplugged before, in and after each stage of a run",
         usb.usb_sensor_unplugged, boot=4),
]
