# Sourced by the demo steps: which sample images they show.
# Families with many test images (one per rule of their recogniser) show the
# few samples named here; every image of the other families is shown.
sampled_families=(windows-legacy windows redhat debian suse mandriva solaris netware freebsd orka macos)
samples=(
  windows-legacy/win98 windows-legacy/win2000pro windows-legacy/winxppro
  windows-legacy/win2003std-x64
  windows/win7-x64 windows/win81-x64 windows/win10-x64 windows/win10-enterprise
  windows/server2012r2 windows/server2019 windows/server2022 windows/win11
  redhat/rhel7-server-workstation redhat/rhel8-x64 redhat/centos7 redhat/centos7-minimal
  redhat/centos8-stream redhat/fedora29 redhat/fedora-live-x64 redhat/oracle8
  debian/deb11-amd64 debian/deb10-arm64 debian/ubu-2004 debian/ubu-2204-arm
  debian/srv-140402 suse/sles10sp2 suse/sled12 suse/leap421 suse/p-sles15
  mandriva/mdv2006-64 mandriva/vol2010-32 mandriva/turbo8 mandriva/lumen-64
  solaris/sol10 solaris/sol11 netware/nw65 freebsd/fbsd13-64 freebsd/fbsd14-arm
  orka/orka41 orka/orkai65
)

# demo_images: the images to show, one path a line.
demo_images() {
  local img family
  while IFS= read -r -d '' img; do
    family=${img#"$media"/}
    family=${family%%/*}
    [[ " ${sampled_families[*]} " == *" $family "* ]] || printf '%s\n' "$img"
  done < <(find "$media" -name '*.iso' -print0 | sort -z)
  for img in "${samples[@]}"; do
    [ -e "$media/$img.iso" ] && printf '%s\n' "$media/$img.iso"
  done
}
