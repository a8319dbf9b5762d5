# Sourced by the tests beside it: installs the build tree BUILD in a directory of its own, $root, and
# finds its library folder, $libraries.
# shellcheck shell=bash disable=SC2034
set -euo pipefail
export LC_ALL=C

example=$(cd "$(dirname "${BASH_SOURCE[0]}")/../../packaging/example" && pwd)
root=$(mktemp -d)
trap 'rm -rf "$root"' EXIT
DESTDIR=$root "$CMAKE" --install "$BUILD" --prefix /usr >/dev/null
libraries=$(dirname "$(find "$root" -name libknvlibs.so)")

# Runs a program built on the library, and expects a number of kilobytes.
expect_kilobytes() {
  local answer
  answer=$(LD_LIBRARY_PATH=$libraries "$1")
  [[ $answer =~ ^[0-9]+\ KB$ ]] || { echo "it says: $answer"; exit 1; }
}
