# SPDX-License-Identifier: Apache-2.0
#
# Where the parts of an installed system lie. Programs find their libraries and each other by their own place, as in a build
# folder, so the whole tree may stand below any prefix.
include(GNUInstallDirs)
set(LOOKHAVEN_DEFAULT_HOME ${CMAKE_SOURCE_DIR}/var CACHE STRING
    "The state folder of programs that are told no other one; an installed system has /var/lib/lookhaven")
set(LOOKHAVEN_INSTALL_FOLDER lib/lookhaven)

# lookhaven_install(): call it when all targets are known.
function(lookhaven_install)
    set(programs lookhaven lookhaven-recorder lookhaven-webapi lookhaven-camera)
    set(libraries lookhaven_player lookhaven_binding lookhaven_decoder lookhaven_remux lookhaven_remote_library
        lookhaven_signature)
    set_target_properties(${programs} PROPERTIES INSTALL_RPATH "$ORIGIN/../lib")
    set_target_properties(${libraries} PROPERTIES INSTALL_RPATH "$ORIGIN")
    install(TARGETS ${programs} RUNTIME DESTINATION ${LOOKHAVEN_INSTALL_FOLDER}/bin COMPONENT lookhaven)
    install(TARGETS ${libraries} LIBRARY DESTINATION ${LOOKHAVEN_INSTALL_FOLDER}/lib COMPONENT lookhaven)
    install(PROGRAMS packaging/prepare-web DESTINATION ${LOOKHAVEN_INSTALL_FOLDER} COMPONENT lookhaven)
    install(FILES packaging/nginx/lookhaven.conf.in DESTINATION ${LOOKHAVEN_INSTALL_FOLDER}/nginx COMPONENT lookhaven)
    install(DIRECTORY client/dist/ DESTINATION share/lookhaven/client COMPONENT lookhaven)
    install(TARGETS lookhaven_player_unbound LIBRARY DESTINATION lib/lookhaven-player COMPONENT player)
endfunction()
