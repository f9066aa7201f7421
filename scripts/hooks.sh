# shellcheck shell=bash
# ./run hooks: sourced by ./run.

hook_text() {
  cat <<'HOOK'
#!/usr/bin/env bash
# neuralWarp's hook, installed by ./run hooks: what is about to be committed is looked at by scripts/pre_commit.sh of
# the worktree that it comes from.
script=$(git rev-parse --show-toplevel)/scripts/pre_commit.sh
[[ ! -x $script ]] || exec "$script"
HOOK
}

command_hooks() {
  local folder hook
  need_packages git clang-format-14
  # of all worktrees the same, and where core.hooksPath says
  folder=$(git_here rev-parse --git-path hooks) || fail "this is no git checkout: there is nothing to hook into"
  hook=$folder/pre-commit
  if [[ -e $hook || -L $hook ]] && ! grep -q "installed by ./run hooks" "$hook" 2>/dev/null; then
    fail "$hook is there and not ours, and stays: remove it, or have it call scripts/pre_commit.sh"
  fi
  mkdir -p "$folder"
  hook_text >"$hook"
  chmod +x "$hook"
  say "installed $hook; git commit --no-verify goes past it"
}
