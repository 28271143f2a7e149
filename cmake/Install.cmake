# SPDX-License-Identifier: Apache-2.0
# What "cmake --install" puts where. The prefix may be named there as well as here: what holds it is
# written at that moment.

set(KEEPSAKES_SYSTEMD_USER_UNIT_DIR lib/systemd/user
    CACHE STRING "Where units of the user's service manager go, below the prefix or absolute")
set(data ${PROJECT_SOURCE_DIR}/data)

install(TARGETS keepsakesd keepsakesctl RUNTIME)
install(TARGETS keepsakes-indexer RUNTIME
        DESTINATION ${CMAKE_INSTALL_LIBEXECDIR}/${KEEPSAKES_LIBEXEC_FOLDER})

# keepsakes_install_configured(<template> <folder>): with @KEEPSAKES_BIN@ and @KEEPSAKES_DOC@ filled
# in, under the template's name without ".in".
function(keepsakes_install_configured template folder)
    cmake_path(GET template STEM LAST_ONLY name)
    set(made ${PROJECT_BINARY_DIR}/install/${name})
    install(CODE "
        get_filename_component(prefix \"\${CMAKE_INSTALL_PREFIX}\" ABSOLUTE)
        get_filename_component(KEEPSAKES_BIN \"${CMAKE_INSTALL_BINDIR}\" ABSOLUTE
                               BASE_DIR \"\${prefix}\")
        get_filename_component(KEEPSAKES_DOC \"${CMAKE_INSTALL_DOCDIR}\" ABSOLUTE
                               BASE_DIR \"\${prefix}\")
        configure_file(\"${template}\" \"${made}\" @ONLY)")
    install(FILES ${made} DESTINATION ${folder})
endfunction()

keepsakes_install_configured(${data}/systemd/keepsakesd.service.in
                             ${KEEPSAKES_SYSTEMD_USER_UNIT_DIR})
keepsakes_install_configured(${data}/dbus/com.brindle.keepsakesd.service.in
                             ${CMAKE_INSTALL_DATADIR}/dbus-1/services)
install(FILES ${data}/com.brindle.keepsakesd.xml
        DESTINATION ${CMAKE_INSTALL_DATADIR}/dbus-1/interfaces)
install(FILES ${data}/completions/keepsakesctl
        DESTINATION ${CMAKE_INSTALL_DATADIR}/bash-completion/completions)
install(FILES ${data}/config.toml ${data}/systemd/hardening.conf
        DESTINATION ${CMAKE_INSTALL_DOCDIR}/examples)

set(man ${PROJECT_SOURCE_DIR}/docs/man)
install(FILES ${man}/keepsakesd.1 ${man}/keepsakesctl.1 ${man}/keepsakes-indexer.1
        DESTINATION ${CMAKE_INSTALL_MANDIR}/man1)
install(FILES ${man}/keepsakesd.toml.5 DESTINATION ${CMAKE_INSTALL_MANDIR}/man5)
