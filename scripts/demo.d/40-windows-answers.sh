# Windows answer files end to end on the sample Windows 10 medium: recognise
# it, check that unattended install is offered, validate the answers, write
# the answer files from the shipped templates and check the XML.
win_img=$media/windows/win10-x64.iso
if [ ! -e "$win_img" ]; then
  echo "== windows answers: skipped (no sample Windows 10 medium)"
else
  win_out=$work/windows-answers
  win_name="Jo & Ann O'Neil"
  win_password='s3cret<&>'
  echo "== windows answers: ${win_img#"$media"/}"
  "$tool" detect "$win_img" | sed -n "1s|^.*: |  detected: |p"
  "$tool" unattended support "$win_img" | sed -n 's/^unattended: */  unattended install: /p'
  for pair in "name|$win_name" "password|$win_password"; do
    printf '  validate %-8s %-18s %s\n' "${pair%%|*}" "'${pair#*|}'" \
      "$("$tool" unattended validate --kind "${pair%%|*}" --text "${pair#*|}" "$win_img" | head -n 1)"
  done
  "$tool" unattended windows --sif "$root/data/windows/winnt.sif" \
    --xml "$root/data/windows/autounattend.xml" --storepwd "$root/data/windows/storePwd.ini" \
    --image-name "Windows 10 Pro" --full-name "$win_name" --password "$win_password" \
    --product-key AAAAA-BBBBB-CCCCC-DDDDD-EEEEE --out "$win_out" "$win_img" |
    sed -n 's|^wrote '"$work"'/|  wrote |p'
  echo "  winnt.sif answers:"
  grep -E '^(ProductKey|FullName|AdminPassword|AutoLogon|TimeZone)=' "$win_out/winnt.sif" |
    sed 's/^/    /'
  echo "  autoun~0.xml account and first-logon commands:"
  grep -m 1 -o '<Username>.*</Username>' "$win_out/autoun~0.xml" | sed 's/^/    /'
  grep -o '<CommandLine>[^<]*</CommandLine>' "$win_out/autoun~0.xml" |
    sed 's/<[^>]*>//g; s/^/    /'
  if xmllint --noout "$win_out/autoun~0.xml"; then
    echo "  xmllint: autoun~0.xml is well-formed"
  else
    echo "  xmllint: autoun~0.xml is NOT well-formed" >&2
    exit 1
  fi
fi
