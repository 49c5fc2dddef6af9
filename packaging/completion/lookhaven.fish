# SPDX-License-Identifier: Apache-2.0
# fish completion for lookhaven(1)

function __lookhaven_complete
    set -l words (commandline --tokenize --cut-at-cursor --current-process)
    set -l last (commandline --cut-at-cursor --current-token)
    set -l candidates ($words[1] __complete $words[2..-1] "$last" 2>/dev/null)
    if set -q candidates[1]
        printf '%s\n' $candidates
    else
        __fish_complete_path "$last"
    end
end
complete --command lookhaven --no-files --arguments '(__lookhaven_complete)'
