#!/usr/bin/env bash
# Mandrake/Mandriva media ("VERSION", the volume identifier, product.id),
# TurboLinux media (README) and Lumen media (LUMEN_TARVEX_CD and RPMS/<arch>).
set -euo pipefail
. "$SRC/scripts/media/lib/mkimage.bash"
out=$1/mandriva
iso=isolinux/isolinux.cfg=default\x20linux\nlabel\x20linux\n\x20\x20kernel\x20alt0/vmlinuz\n

# name | VERSION | more entries
table "$out" VERSION <<EOT
mdv2006-64      | Mandriva Linux 2006.0 (Official) for x86_64\n   | $iso
mdv2006-32      | Mandriva Linux 2006.0 (Free) for i586\n
mdk101          | Mandrake Linux 10.1 (Community) for i586\n      | $iso
mdk-any         | Mandrake
mdv2006-ppc     | Mandriva Linux 2006.0 (Official) for ppc\n
mdv-noyear      | Mandriva Linux (Official) for x86_64\n
other           | Linux 2006.0 for x86_64\n
bad-empty       |
EOT

pid="vendor=Mandriva,distribution=Mandriva Linux,type=basic"
image "$out" vol2010-32 -V "Mandriva.2010.0 i586" README=x
image "$out" vol2010-64 -V "Mandriva.2010.2 x86_64" "$iso"
image "$out" vol2010-32iso -V "Mandriva.2011.0 i586" "i586/$iso"
image "$out" vol2009 -V "Mandriva.2009.0 i586" README=x
image "$out" vol2010-ppc -V "Mandriva.2010.0 ppc" "i586/product.id=$pid,branch=Official,arch=i586,product=Free\n"
image "$out" vol2010-ppc-only -V "Mandriva.2010.0 ppc" README=x
image "$out" vol2010-noversion-pid -V "Mandriva.2010.0 i586" \
  "i586/product.id=$pid,version=2007.0,branch=Official,arch=i586\n"
image "$out" pid2008.0 -V MDV_I586 "i586/product.id=$pid,version=2008.0,branch=Official,release=1,arch=i586,product=Free\n" "i586/$iso"
image "$out" pid2007.1 -V MDV_X86_64 "x86_64/product.id=$pid,version=2007.1,branch=Official,release=2,arch=x86_64,product=PowerPack\n"
image "$out" pid2009.1 -V MDV "i586/product.id=$pid,version=2009.1 branch=Official,arch=i586\n"
image "$out" pid2006.0 -V MDV "i586/product.id=$pid,version=2006.0,branch=Official,arch=i586\n"
image "$out" pid-ppc -V MDV "i586/product.id=$pid,version=2008.0,branch=Official,arch=ppc\n"
image "$out" pid-noarch -V MDV "i586/product.id=$pid,version=2008.0,branch=Official\n"
image "$out" pid-noversion -V MDV "x86_64/product.id=$pid,branch=Official,arch=x86_64\n"
image "$out" pid-othervendor -V MDV "i586/product.id=vendor=Mageia,version=2,arch=i586\n"
image "$out" pid-binary -V MDV "i586/product.id=vendor=Mandriva\x00arch=i586\x00version=2008.0\n"
image "$out" pid-lastfield -V MDV "i586/product.id=${pid},arch=i586,version="

# name | README | more entries
table "$out" README <<EOT
turbo8          | Turbolinux Server 8.0\n\nPlease read the release notes before installing.\n
turbo-caps      | TurboLinux Server 8.0\n
turbo-late      | Welcome.\nTurbolinux 10 Desktop\n
EOT

image "$out" lumen-64 LUMEN_TARVEX_CD= RPMS/x86_64/ "$iso"
image "$out" lumen-arm LUMEN_TARVEX_CD= RPMS/aarch64/
image "$out" lumen-both LUMEN_TARVEX_CD= RPMS/x86_64/ RPMS/aarch64/
image "$out" lumen-none LUMEN_TARVEX_CD= RPMS/
image "$out" lumen-nomarker RPMS/x86_64/
