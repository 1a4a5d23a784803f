run probe quazor phone probe
diagnose back CameraSyncDiagnostic.Back --set duration=2.015
diagnose fault TesselFaultDiagnostic --set experiment.frameCount=1 --set timeout=2 --set analysis.frameCount=1
diagnose channels TesselTelemonDiagnostic
capture image --set images=1 --set timeout=2
