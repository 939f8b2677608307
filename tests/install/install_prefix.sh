#!/bin/sh
# Installs a build, looks at what came of it and moves it elsewhere, because an installation must
# work wherever it is put.
#
#   install_prefix.sh BUILD PREFIX LIBDIR
set -eu
build=$1
prefix=$2
lib=$3
stage=$prefix.stage
failures=0

fail() {
    echo "install_prefix: $*" >&2
    failures=$((failures + 1))
}

rm -rf "$stage" "$prefix"
cmake --install "$build" --prefix "$stage" >/dev/null

for file in bin/zavhost bin/zavctl bin/zavplatform-conformance "$lib/libzavmgmt.a" \
    "$lib/libzavplatform-conformance.a" "$lib/pkgconfig/zavmgmt.pc" \
    "$lib/cmake/zavmgmt/zavmgmtConfig.cmake" \
    include/zavmgmt/platform/oxa.h include/zavmgmt/embedded/oxa_host.h \
    include/zavmgmt/conformance/driver.h include/zavmgmt/mgmt/zavmgmt.h \
    share/man/man1/zavctl.1 share/man/man1/zavctl-install.1 share/man/man5/zavhost.conf.5 \
    share/man/man7/zavmgmt.7 share/man/man8/zavhost.8 share/zavmgmt/home/bin/prepare-home; do
    [ -f "$stage/$file" ] || fail "there is no $file"
done

for library in zavmgmt zavplatform; do
    file=$stage/$lib/lib$library.so
    [ -L "$file" ] || fail "$file is not a link"
    [ -L "$file.1" ] || fail "$file.1 is not a link"
    readelf -d "$file" | grep -q "SONAME.*\[lib$library.so.1\]" || fail "$file has another soname"
done

# Nothing that others read may lead back to where it was built or installed at first.
for text in "$stage/$lib"/cmake/zavmgmt/* "$stage/$lib"/pkgconfig/*; do
    ! grep -n -e "$stage" -e "$build" "$text" || fail "$text holds a path of this build"
done

mv "$stage" "$prefix"
[ "$failures" -eq 0 ]
