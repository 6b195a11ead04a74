# The Windows XP road ends on a floppy: answer files for the sample XP
# medium packed with the logon helper, the first-logon script and a
# mass-storage driver set into autoinst.flp, which setup reads. The helpers
# and the driver set stand in for the ones the product ships.
xp_img=$media/windows-legacy/winxppro.iso
if [ ! -e "$xp_img" ]; then
  echo "== windows floppy: skipped (no sample Windows XP medium)"
else
  xp_res=$work/windows-floppy/resources
  xp_drv=$work/windows-floppy/lsi-sas
  xp_out=$work/windows-floppy/config
  mkdir -p "$xp_res" "$xp_drv"
  printf '@echo off\r\n' >"$xp_res/unattend.cmd"
  printf 'MZ' >"$xp_res/storePwd.exe"
  printf '[Disks]\r\nd1 = "LSI SAS Driver Disk",\\lsi_sas.sys,\\\r\n[scsi]\r\nLSI_SAS_32 = "LSI SAS 3000 series (XP 32-bit)"\r\n' \
    >"$xp_drv/txtsetup.oem"
  printf 'driver' >"$xp_drv/lsi_sas.sys"
  echo "== windows floppy: ${xp_img#"$media"/}"
  "$tool" unattended windows --sif "$root/data/windows/winnt.sif" \
    --xml "$root/data/windows/autounattend.xml" --storepwd "$root/data/windows/storePwd.ini" \
    --image-name "Windows XP Professional" --full-name "Jo Doe" --password 's3cret' \
    --out "$xp_out" --floppy --resource-dir "$xp_res" --scsi-dir "$xp_drv" "$xp_img" |
    sed -n 's|^wrote '"$work"'/|  wrote |p'
  echo "  tvxguest floppy ls autoinst.flp:"
  "$tool" floppy ls "$xp_out/autoinst.flp" | sed 's/^/    /'
  echo "  winnt.sif on the floppy, driver sections:"
  "$tool" floppy get "$xp_out/autoinst.flp" winnt.sif |
    sed -n '/^\[OEMBootFiles\]/,$p' | sed 's/^/    /'
fi
