# Sourced by the other scripts: strict mode and the top of the source tree as working directory.
set -euo pipefail
cd "$(dirname "${BASH_SOURCE[0]}")/.."

say() { printf '== %s\n' "$*"; }

# Build jobs: one a core, but no more than memory allows (a compiler takes up to about 1 GB).
jobs() {
    local cores memory
    cores=$(nproc)
    memory=$(awk '/^MemAvailable:/ { print int($2 / 1048576) }' /proc/meminfo)
    echo $((memory < 1 ? 1 : memory < cores ? memory : cores))
}
