load_usb
jitter=4
connect_cameras punctual_camera 2
probe_machine
judge_camera punctual
disconnect_cameras punctual_camera
connect_cameras late_camera 2 --late-every 10 --late-by 25
judge_camera late
jitter=
disconnect_cameras late_camera
connect_cameras mute_camera 2 --mute-after 30
judge_camera mute
disconnect_cameras mute_camera
connect_cameras silent_camera 2 --mute-after 0
judge_camera silent
disconnect_cameras silent_camera
healthy_usb_again
