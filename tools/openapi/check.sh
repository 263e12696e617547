#!/bin/sh
# Holds the agent's OpenAPI description against tools of others: two that judge it, and a client's types.
#   check.sh OPENAPI_JSON WORK_FOLDER
# The tools are installed in the work folder, in the versions of the lock file, unless they are there.
set -eu
description=$(realpath "$1")
here=$(realpath "$(dirname "$0")")
mkdir -p "$2/generated"
cd "$2"

if ! cmp -s "$here/package-lock.json" installed-lock.json; then
  cp "$here/package.json" "$here/package-lock.json" "$here/.npmrc" .
  npm ci --silent
  cp package-lock.json installed-lock.json
fi
cp "$here/redocly.yaml" "$here/.spectral.yaml" "$here/tsconfig.json" "$here/client.ts" .
tool() {
  echo "== $*"
  REDOCLY_TELEMETRY=off "node_modules/.bin/$@"
}
tool redocly lint --config redocly.yaml "$description"
tool spectral lint --fail-severity=hint --ruleset .spectral.yaml "$description"
tool openapi-typescript "$description" --output generated/agent.ts
tool tsc --project tsconfig.json
