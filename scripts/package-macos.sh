#!/usr/bin/env bash
# Packs a universal launcher into the archive a Mac administrator deploys:
#
#   scripts/package-macos.sh LAUNCHER DIR
#
# writes DIR/rcplauncher-<version>-macos-universal.tar.gz (the version of
# project() in CMakeLists.txt) and prints its path. The archive holds one
# directory of the same name with the tree `cmake --install` lays out (the
# launcher as rcp/rcplauncher, the sample installation of demo/inst), the
# administrator's pages of docs/ and a README saying what to edit first.
#
# Reproducible: the same input gives the same bytes. Names are sorted, owner
# and group are 0, every time is that of the last commit (SOURCE_DATE_EPOCH
# when set), directories and programs have mode 0755 and other files 0644
# whatever the umask, and gzip stores no name or time. Scripts/check-macos.sh
# packs twice and compares.
set -euo pipefail
cd "$(dirname "$0")/.."

if [ $# -ne 2 ] || [ ! -f "$1" ] || [ ! -d "$2" ]; then
  echo "usage: scripts/package-macos.sh LAUNCHER DIR" >&2
  exit 2
fi
launcher=$1
version=$(sed -n 's/^project(rcplauncher VERSION \([0-9.]*\).*/\1/p' CMakeLists.txt)
name=rcplauncher-$version-macos-universal
archive=$(cd "$2" && pwd)/$name.tar.gz
epoch=${SOURCE_DATE_EPOCH:-$(git log -1 --format=%ct 2>/dev/null || echo 0)}

stage=$(mktemp -d)
trap 'rm -rf "$stage"' EXIT
tree=$stage/$name
mkdir -p "$tree/rcp" "$tree/docs"
cp -R demo/inst/. "$tree/"
cp "$launcher" "$tree/rcp/rcplauncher"
chmod 0755 "$tree/rcp/rcplauncher"
cp docs/configurations.md docs/macos.md docs/messages.md docs/options.md docs/properties.md "$tree/docs/"
cat >"$tree/README" <<EOF
rcplauncher $version for macOS 11.0 and later, Intel and Apple Silicon
==================================================================

rcp/rcplauncher is the native launcher of the platform: it prepares each
user's workspace and configuration area and starts the platform (the Eclipse
executable, or the JVM itself for a service installation). It writes nothing
to the terminal; its log is described in docs/messages.md.

The directory this README is in is the installation directory: move it where
the installation is to live, keeping the directory named "rcp" in lower case.
The sample is a "service" installation that runs the Equinox framework.

Edit first:

1. rcp/rcplauncher.properties
   - jvm.location: the java of a JDK, e.g.
     /Library/Java/JavaVirtualMachines/<jdk>/Contents/Home/bin/java,
     not /usr/bin/java (see docs/macos.md);
   - rcp.install.id: an identifier of this installation;
   - install.configuration: how the installation is used
     (docs/configurations.md).
2. base/rcpinstall.properties: the class path, application, JVM arguments and
   environment of the platform (docs/properties.md).
3. base/config.ini and base/platform.xml: the platform's start-up
   configuration and update-site record, copied for each user.
4. eclipse/plugins: the Equinox launcher, the framework and the application's
   bundles (eclipse/plugins/README.txt).

Before deploying: the launcher is signed ad hoc only, and a downloaded copy is
quarantined; sign it with your Developer ID and notarize it, or deploy it
through your management tool (docs/macos.md, "Gatekeeper").

To try it: rcp/rcplauncher -rcpLauncherWait -debug, then read the log.
EOF

# Only directories and regular files: a link or a special file in the sample
# tree would reach the administrator as it is.
if [ -n "$(find "$tree" ! -type d ! -type f)" ]; then
  echo "package-macos: only directories and regular files can be packed:" >&2
  find "$tree" ! -type d ! -type f >&2
  exit 1
fi
find "$tree" -type d -exec chmod 0755 {} +
find "$tree" -type f -perm -u+x -exec chmod 0755 {} +
find "$tree" -type f ! -perm -u+x -exec chmod 0644 {} +
# Written beside its final name and renamed: never a partial archive there.
tar --sort=name --owner=0 --group=0 --numeric-owner --mtime="@$epoch" --format=ustar \
  -C "$stage" -cf - "$name" | gzip -n -9 >"$archive.partial"
mv -f "$archive.partial" "$archive"
echo "$archive"
