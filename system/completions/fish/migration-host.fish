# fish completion for migration-host; the options are those that its help lists.

complete -c migration-host -f
complete -c migration-host -l root -r -a '(__fish_complete_directories)'
complete -c migration-host -l home -r -a '(__fish_complete_directories)'
complete -c migration-host -l shared-resources -r -a '(__fish_complete_directories)'
complete -c migration-host -l resources -r -a '(__fish_complete_directories)'
complete -c migration-host -l plugin -r -F
complete -c migration-host -l trace -r -F
complete -c migration-host -l metrics -r -F
complete -c migration-host -l explain -a 'text json html'
complete -c migration-host -l dry-run
complete -c migration-host -l serve-rehearsals
complete -c migration-host -l strict
complete -c migration-host -l careful
complete -c migration-host -l refuse-loss
complete -c migration-host -l lock-timeout -x
complete -c migration-host -l snapshots -r -a '(__fish_complete_directories)'
complete -c migration-host -l keep -x
complete -c migration-host -l list-snapshots -a json
complete -c migration-host -l if-needed
complete -c migration-host -l restore -x
complete -c migration-host -l undo
complete -c migration-host -l release -x
complete -c migration-host -l of -x
complete -c migration-host -l help -s h
complete -c migration-host -l version
