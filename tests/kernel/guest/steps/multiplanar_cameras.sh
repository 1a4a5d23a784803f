load_devices multiplanar=2,2,2,2,2
cat /sys/module/vivid/parameters/multiplanar >"$out/multiplanar"
run_probed_cameras
