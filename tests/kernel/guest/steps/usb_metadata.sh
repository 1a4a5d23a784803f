load_usb
make_channels
binding=/rig/usb_projector.json
connect_cameras camera 2
fault() {
  judge "$1" TesselFaultDiagnostic --set experiment.frameCount=60 --set timeout=10 --set analysis.frameCount=60
}
fault driver_stamps
echo 1 >/sys/module/uvcvideo/parameters/hwtimestamps
fault device_stamps
# The driver stamps the metadata otherwise.
binding=$out/by_time.json
sed 's/"format": "UVCH"/"pairing": "timestamp", &/' /rig/usb_projector.json >"$binding"
fault paired_by_time
echo 0 >/sys/module/uvcvideo/parameters/hwtimestamps
run dark_after video_control usb-vhci_hcd.0-1 capture get Gain
disconnect_cameras camera
