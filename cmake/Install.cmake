# What `cmake --install` lays out, and where.

# Programs and libraries look for the shared rooms from where they lie themselves.
set_target_properties(zeb bvmake PROPERTIES INSTALL_RPATH "$ORIGIN/${ZEB_CODE_FROM_PROGRAMS}")
set_target_properties(zebd PROPERTIES INSTALL_RPATH "$ORIGIN/${ZEB_CODE_FROM_DAEMON}")
set_target_properties(platform Zebrine Luxwell PROPERTIES INSTALL_RPATH "$ORIGIN")
set_target_properties(HelpPlugin PROPERTIES INSTALL_RPATH "$ORIGIN/..")

install(TARGETS zeb bvmake DESTINATION ${CMAKE_INSTALL_BINDIR})
install(TARGETS zebd DESTINATION ${ZEB_DAEMON_FOLDER})
install(TARGETS platform Zebrine Luxwell DESTINATION ${ZEB_CODE_FOLDER})
install(TARGETS HelpPlugin DESTINATION ${ZEB_CODE_FOLDER}/HelpPlugin.bundle)
install(FILES ${CMAKE_BINARY_DIR}/plugin/HelpPlugin.bundle/Info.plist
        DESTINATION ${ZEB_CODE_FOLDER}/HelpPlugin.bundle)

install(DIRECTORY books/manual books/offline DESTINATION ${CMAKE_INSTALL_DATADIR}/zeb/books)

# Both name the daemon by its absolute path, which is known when the prefix is.
set(sources ${CMAKE_CURRENT_SOURCE_DIR}/install)
set(made ${CMAKE_BINARY_DIR}/install)
install(CODE "
  get_filename_component(ZEB_DAEMON_PATH \"${ZEB_DAEMON_FOLDER}/zebd\" ABSOLUTE
                         BASE_DIR \"\${CMAKE_INSTALL_PREFIX}\")
  configure_file(\"${sources}/zebd.service.in\" \"${made}/zebd.service\" @ONLY)
  configure_file(\"${sources}/org.zeb.zebd.service.in\" \"${made}/org.zeb.zebd.service\" @ONLY)
")
install(FILES ${made}/zebd.service DESTINATION ${ZEB_USER_UNITS_FOLDER})
install(FILES ${made}/org.zeb.zebd.service
        DESTINATION ${CMAKE_INSTALL_DATADIR}/dbus-1/services)

install(FILES docs/man/zeb.1 docs/man/bvmake.1 DESTINATION ${CMAKE_INSTALL_MANDIR}/man1)
install(FILES docs/man/zebd.8 DESTINATION ${CMAKE_INSTALL_MANDIR}/man8)

set(completions install/completions)
foreach(program zeb bvmake)
  install(FILES ${completions}/${program}.bash RENAME ${program}
          DESTINATION ${CMAKE_INSTALL_DATADIR}/bash-completion/completions)
  install(FILES ${completions}/_${program} DESTINATION ${ZEB_ZSH_COMPLETIONS_FOLDER})
  install(FILES ${completions}/${program}.fish
          DESTINATION ${CMAKE_INSTALL_DATADIR}/fish/vendor_completions.d)
endforeach()

install(FILES README.md docs/bus.md docs/bvmake.md DESTINATION ${CMAKE_INSTALL_DOCDIR})
install(FILES install/copyright DESTINATION ${CMAKE_INSTALL_DOCDIR})
install(DIRECTORY docs/formats DESTINATION ${CMAKE_INSTALL_DOCDIR})
