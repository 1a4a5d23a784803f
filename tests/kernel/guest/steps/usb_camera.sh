load_usb
connect_cameras camera 2
probe_machine
trace_frames
judge_camera single
keep_trace single $(usb_buses 1)
disconnect_cameras camera
