#!/usr/bin/env bash
# Masters the image-based Windows setup media (Vista and newer) used by the
# tests and the demo into OUTDIR/windows/NAME.iso.
#
# Every image starts from tests/data/windows/base (boot manager, setup and
# boot stand-ins) plus one lang.ini from tests/data/windows/lang; the table
# below adds what tells the releases apart. Images are UDF bridge media like
# the real ones; rows marked udf-only carry their files in UDF alone, with a
# lone README.TXT in the ISO 9660 tree, as newer Windows media do.
#
# Row: NAME|BUILD BRANCH|BUILD ARCH|OPTIONS, options separated by blanks:
#   type=T          sources/product.ini with Type=T
#   ei=ED[,CH]      sources/ei.cfg naming edition ED (and channel CH);
#                   ei=@empty / ei=@binary for broken files
#   clg=NAME        sources/install_NAME.clg ("+" stands for a blank)
#   bg esd nano     background_svr.bmp, install.esd instead of install.wim,
#                   NanoServer/ReadMe.txt
#   appx=skype|noskype   the appx provisioning manifest
#   lang=NAME       lang.ini variant (default en-US); @huge, @none
#   idwb=@empty|@binary|@oneline|@noarch   broken idwbinfo.txt
#   udf-only
# Usage: scripts/media/windows.sh OUTDIR   (SRC = repository root)
set -euo pipefail
out=${1:?usage: windows.sh OUTDIR}/windows
SRC=${SRC:-$(cd "$(dirname "$0")/../.." && pwd)}
. "$SRC/scripts/media/lib/mkimage.bash"
data=$SRC/tests/data/windows
mkdir -p "$out"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

cases=$(cat <<'EOF'
vista-x86|vista_rtm|x86|clg=Windows+Vista+ULTIMATE clg=Windows+Vista+BUSINESS
vista-by-catalogue|longhorn_rtm|amd64|clg=Windows+Vista+HOMEPREMIUM
server2008-x64|lh_sp2rtm|amd64|type=Server
win7-x64|win7_rtm|amd64|clg=Windows+7+ULTIMATE lang=two
win7-x86|win7sp1_rtm|x86|lang=de-DE
win7-by-catalogue|longhorn_rtm|x86|clg=Windows+7+PROFESSIONAL
server2008r2|win7_rtm|amd64|type=Server
win8-x64|win8_rtm|amd64|
win8-enterprise|win8_rtm|amd64|ei=Enterprise,Volume
win8-trial|win8_rtm|x86|ei=EnterpriseEval clg=Windows+8+ENTERPRISEEVAL
win81-x64|winblue_rtm|amd64|type=Client
win81-pro-n|winblue_rtm|x86|ei=ProfessionalN,Retail
win81-enterprise|winblue_rtm|amd64|ei=Enterprise,Volume
win81-enterprise-n|winblue_rtm|x86|ei=EnterpriseN,Volume
win81-trial|winblue_rtm|amd64|ei=EnterpriseEval clg=Windows+8.1+ENTERPRISEEVAL
win81-ei-empty|winblue_rtm|amd64|ei=@empty
win81-ei-binary|winblue_rtm|amd64|ei=@binary
win81-no-arch|winblue_rtm|amd64|idwb=@noarch
server2012|win8_rtm|amd64|bg
server2012-trial|win8_rtm|amd64|bg ei=ServerStandardEval,eval clg=Windows+Server+2012+SERVERSTANDARDEVAL
server2012r2|winblue_rtm|amd64|bg
server2012r2-trial|winblue_rtm|amd64|type=Server ei=ServerDatacenterEval,eval
server2012r2-volume|winblue_rtm|amd64|bg ei=ServerStandard,eval+volume
hyperv2012r2|winblue_rtm|amd64|bg ei=ServerHyperCore clg=Hyper-V+Server+2012+R2+SERVERHYPERCORE
win10-x64|th1|amd64|
win10-zh|th2_release|amd64|lang=zh-CN
win10-n|th2_release|amd64|appx=noskype
win10-skype|th2_release|amd64|appx=skype
win10-enterprise|th1|amd64|ei=Enterprise,Volume
win10-ltsb2015|th1|amd64|ei=EnterpriseS,Volume
win10-ltsb2016-n|rs1_release|amd64|ei=enterprisesn,Volume
win10-pro-ei|th2_release|amd64|ei=Professional,Retail
win10-esd-x86|th2_release|x86|esd
win10-esd-arm64|th2_release|arm64|esd
win10-winbranch|winthreshold|x86|
win10-rs3|rs3_release|amd64|
win10-rs3-ei|rs3_release|amd64|ei=Education
win10-rs4-ei|rs4_release|amd64|ei=Education
win10-rs5|rs5_release|amd64|
win10-rs5-ltsc|rs5_release|amd64|ei=EnterpriseS,Volume
win10-rs5-education|rs5_release|amd64|ei=Education
win10-19h1|19h1_release|amd64|
win10-vb-ei|vb_release|amd64|ei=Education udf-only
win10-fbl|fbl_release|amd64|
server2016|rs1_release|amd64|nano
server2016-essentials|rs1_release|amd64|bg
hyperv2016|rs1_release|amd64|ei=ServerHyperCore clg=Hyper-V+Server+2016+SERVERHYPERCORE
server2016-tp5|rs1_release_svc_prod1|amd64|nano
server2016-tp5-solution|rs1_release_svc_prod1|amd64|
server1709|rs3_release|amd64|bg
server2019|rs5_release|amd64|bg
server2019-ei|rs5_release|amd64|bg ei=ServerStandard,Volume
server2004|20h1_release|amd64|bg
server2022|fe_release|amd64|udf-only
win11|co_release|amd64|udf-only lang=two
win11-arm64|ni_release|arm64|
win11-x86|co_release|x86|
winmain-server|winmain|amd64|type=Server
winmain-client|winmain|amd64|type=Client
unknown-branch-server|zz_release|x86|type=Server
lang-tie|win7_rtm|amd64|lang=tie
lang-not-a-number|win7_rtm|amd64|lang=not-a-number
lang-lf-only|win7_rtm|amd64|lang=lf-only
lang-truncated|win7_rtm|amd64|lang=truncated
lang-long-tag|win7_rtm|amd64|lang=long-tag
lang-huge|win7_rtm|amd64|lang=@huge
lang-missing|win7_rtm|amd64|lang=@none
idwb-empty|win7_rtm|amd64|idwb=@empty
idwb-binary|win7_rtm|amd64|idwb=@binary
idwb-one-line|th1|amd64|idwb=@oneline
EOF
)

crlf() { printf '%s\r\n' "$@"; }

# A few hundred bytes that are neither text nor any marker the recogniser
# looks for, NUL bytes included.
binary() { head -c 600 /dev/zero | tr '\0' '\201'; printf '\0\0\377\376\r\n=\0"'; }

write_idwbinfo() {  # FILE BRANCH ARCH MODE
  case $4 in
    @empty) : >"$1" ;;
    @binary) binary >"$1" ;;
    @oneline) printf '[BUILDINFO] BuildArch=%s BuildBranch=%s' "$3" "$2" >"$1" ;;
    @noarch) crlf '[BUILDINFO]' "BuildBranch=$2" 'BuildBuild=9600' 'BuildFlavor=fre' >"$1" ;;
    *) crlf '[BUILDINFO]' "BuildArch=$3" "BuildBranch=$2" 'BuildBuild=0' 'BuildFlavor=fre' \
         'BuildQFE=1' >"$1" ;;
  esac
}

write_lang() {  # FILE VARIANT
  case $2 in
    @none) ;;
    @huge)
      # Some 40 000 language lines: the lists must stay within their fields.
      { crlf '[Available UI Languages]'
        for a in a b c d e f g h i j k l m n o p q r s t; do
          for b in a b c d e f g h i j k l m n o p q r s t u v w x y z; do
            for n in $(seq 1 80); do printf '%s%s-X%d = %d\r\n' "$a" "$b" "$n" "$n"; done
          done
        done
        crlf 'en-US = 100000' '' '[Fallback Languages]' 'en-US = en-us'; } >"$1" ;;
    *) cp "$data/lang/$2.ini" "$1" ;;
  esac
}

write_eicfg() {  # FILE EDITION[,CHANNEL]
  case $2 in
    @empty) : >"$1" ;;
    @binary) binary >"$1" ;;
    *,*) crlf '[EditionID]' "${2%%,*}" '' '[Channel]' "$(echo "${2#*,}" | tr + ' ')" '' '[VL]' '0' >"$1" ;;
    *) crlf '[EditionID]' "$2" '' '[Channel]' 'Retail' '' '[VL]' '0' >"$1" ;;
  esac
}

appx_manifest() {  # FILE WITH_SKYPE
  local dir
  dir=$(dirname "$1")
  mkdir -p "$dir"
  {
    crlf '<?xml version="1.0" encoding="utf-8"?>' '<AppxProvisioning>'
    crlf '  <Package><Name>Microsoft.WindowsCalculator</Name></Package>'
    [ "$2" = skype ] && crlf '  <Package><Name>Microsoft.SkypeApp</Name></Package>'
    crlf '</AppxProvisioning>'
  } >"$1"
}

label() { basename "$1" .iso | tr a-z- A-Z_ | cut -c1-32; }

master_bridge() {  # TREE IMAGE
  master "$2" "$1" genisoimage -quiet -udf -iso-level 3 -J -joliet-long -R -V "$(label "$2")" \
    -o "$2" "$1"
}

# UDF alone carries the tree; the ISO 9660 side holds only README.TXT.
master_udf_only() {  # TREE IMAGE
  master "$2" "$1" /usr/bin/python3 - "$1" "$2" "$(label "$2")" <<'PY'
import io, os, sys
import pycdlib
tree, image, label = sys.argv[1], sys.argv[2], sys.argv[3]
iso = pycdlib.PyCdlib()
iso.new(interchange_level=3, udf='2.60', vol_ident=label)
note = b'This disc contains a "UDF" file system and requires an operating system\r\nthat reads ISO-13346 "UDF" file systems.\r\n'
iso.add_fp(io.BytesIO(note), len(note), iso_path='/README.TXT;1')
for root, dirs, files in os.walk(tree):
    dirs.sort()
    rel = os.path.relpath(root, tree)
    base = '' if rel == '.' else '/' + rel.replace(os.sep, '/')
    for d in dirs:
        iso.add_directory(udf_path=base + '/' + d)
    for f in sorted(files):
        with open(os.path.join(root, f), 'rb') as fp:
            data = fp.read()
        iso.add_fp(io.BytesIO(data), len(data), udf_path=base + '/' + f)
iso.write(image)
iso.close()
PY
}

while IFS='|' read -r name branch arch opts; do
  [ -n "$name" ] || continue
  tree=$work/$name
  cp -r "$data/base" "$tree"
  src=$tree/sources
  lang=en-US idwb=normal esd=0 udf=0
  for opt in $opts; do
    case $opt in
      type=*) crlf '[General]' "Type=${opt#type=}" >"$src/product.ini" ;;
      ei=*) write_eicfg "$src/ei.cfg" "${opt#ei=}" ;;
      clg=*) crlf 'catalogue stand-in' >"$src/install_$(echo "${opt#clg=}" | tr + ' ').clg" ;;
      bg) printf 'BM stand-in' >"$src/background_svr.bmp" ;;
      esd) esd=1 ;;
      nano) mkdir -p "$tree/NanoServer" && crlf 'Nano Server' >"$tree/NanoServer/ReadMe.txt" ;;
      appx=*) appx_manifest "$src/replacementmanifests/microsoft-windows-appx-deployment-server/appxprovisioning.xml" "${opt#appx=}" ;;
      lang=*) lang=${opt#lang=} ;;
      idwb=*) idwb=${opt#idwb=} ;;
      udf-only) udf=1 ;;
      *) echo "windows.sh: $name: unknown option $opt" >&2; exit 1 ;;
    esac
  done
  if [ $esd = 1 ]; then printf 'ESD stand-in' >"$src/install.esd"; else printf 'WIM stand-in' >"$src/install.wim"; fi
  write_idwbinfo "$src/idwbinfo.txt" "$branch" "$arch" "$idwb"
  write_lang "$src/lang.ini" "$lang"
  if [ $udf = 1 ]; then master_udf_only "$tree" "$out/$name.iso"; else master_bridge "$tree" "$out/$name.iso"; fi
  rm -rf "$tree"
done <<<"$cases"
