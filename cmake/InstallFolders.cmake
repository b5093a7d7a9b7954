# Where the parts of an installation go. Folders follow GNUInstallDirs; programs find each other by
# relative paths, so an installation may be moved, and `cmake --install --prefix` may name any place.
include(GNUInstallDirs)

# Whatever the umask of whoever installs.
set(CMAKE_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS OWNER_READ OWNER_WRITE OWNER_EXECUTE
    GROUP_READ GROUP_EXECUTE WORLD_READ WORLD_EXECUTE)

# What only this system's own programs use.
set(ZEB_CODE_FOLDER ${CMAKE_INSTALL_LIBDIR}/zeb)
set(ZEB_DAEMON_FOLDER ${CMAKE_INSTALL_LIBEXECDIR}/zeb)

# Of Debian's own packages zsh takes completions from another folder than from all others.
set(zsh_folder zsh/site-functions)
if(CMAKE_INSTALL_PREFIX STREQUAL "/usr" AND EXISTS /etc/debian_version)
  set(zsh_folder zsh/vendor-completions)
endif()
set(ZEB_ZSH_COMPLETIONS_FOLDER ${CMAKE_INSTALL_DATADIR}/${zsh_folder}
    CACHE STRING "Where completions for zsh are installed")
set(ZEB_USER_UNITS_FOLDER lib/systemd/user
    CACHE STRING "Where units of the user's service manager are installed")

get_filename_component(programs_path ${CMAKE_INSTALL_FULL_BINDIR} ABSOLUTE)
get_filename_component(code_path ${CMAKE_INSTALL_FULL_LIBDIR}/zeb ABSOLUTE)
get_filename_component(daemon_path ${CMAKE_INSTALL_FULL_LIBEXECDIR}/zeb ABSOLUTE)
file(RELATIVE_PATH ZEB_CODE_FROM_PROGRAMS ${programs_path} ${code_path})
file(RELATIVE_PATH ZEB_CODE_FROM_DAEMON ${daemon_path} ${code_path})
file(RELATIVE_PATH ZEB_PROGRAMS_FROM_DAEMON ${daemon_path} ${programs_path})
file(RELATIVE_PATH ZEB_DAEMON_FROM_PROGRAMS ${programs_path} ${daemon_path})
