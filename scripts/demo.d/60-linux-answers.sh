# Linux answer files end to end on the Red Hat, Ubuntu and SUSE sample media:
# recognise each, write its answer file with a full name and a password that
# would run as code if they were not escaped, then show the key lines, let
# each file's own parser read it and check the encrypted passwords.
linux_name='Jo "JJ" O'"'"'Neil & Co <x> Zoë 王'
linux_password='$(touch pwned)'
linux_ok() {  # linux_ok WHAT COMMAND...: say WHAT when COMMAND succeeds, else stop
  local what=$1; shift
  if "$@"; then echo "    $what"; else echo "  FAILED: $what" >&2; exit 1; fi
}
linux_verifies() { "$tool" crypt --check "$1" -- "$2" >/dev/null; }
echo "== linux answers: full name '$linux_name', password '$linux_password'"
for sample in redhat/centos7 debian/ubu-2004 suse/sles11; do
  img=$media/$sample.iso
  [ -e "$img" ] || { echo "  $sample: skipped (not mastered)"; continue; }
  out=$work/linux-answers/${sample#*/}
  "$tool" unattended linux --user jo --full-name "$linux_name" --password "$linux_password" \
    --root-password "root-$linux_password" --out "$out" "$img" |
    sed -e "s|^$media/|  |" -e "s|^wrote $work/|    wrote |"
  case $sample in
    redhat/*)
      file=$out/ks.cfg
      grep -E '^(rootpw|/usr/sbin/usermod|/usr/bin/chfn)' "$file" | sed 's/^/    /'
      user_hash=$(sed -n "s|^/usr/sbin/usermod -p '\([^']*\)'.*|\1|p" "$file")
      sed -n '/^%post$/,/^%end$/p' "$file" | sed '1d;$d' >"$out/post.sh"
      linux_ok "sh -n: the %post script parses" sh -n "$out/post.sh" ;;
    debian/*)
      file=$out/custom/preseed.cfg
      grep -E 'passwd/(user-fullname|username|user-password-crypted)' "$file" | sed 's/^/    /'
      user_hash=$(sed -n 's|^ubiquity   passwd/user-password-crypted password ||p' "$file")
      linux_ok "debconf-set-selections -c: the file parses" debconf-set-selections -c "$file" ;;
    suse/*)
      file=$out/autoinst.xml
      grep -E '<(forename|user_password|username)>' "$file" | sed 's/^ */    /'
      user_hash=$(xmllint --xpath "string((//*[local-name()='user_password'])[2])" "$file")
      linux_ok "xmllint: the profile is well-formed" xmllint --noout "$file" ;;
  esac
  linux_ok "crypt --check: the typed password matches the user's hash" \
    linux_verifies "$user_hash" "$linux_password"
done
linux_ok "no typed text ran as code" test ! -e pwned -a ! -e "$work/pwned"
