# Run by CPack on the staged package tree: /usr/bin/tarnova-agent, a link to the launcher, so that
# the command is on PATH, and /etc/ansible/facts.d/tarnova.fact, a link to the Ansible local fact,
# where fact gathering looks for it. Each finds the install directory through its link.
foreach(_link usr/bin/tarnova-agent etc/ansible/facts.d/tarnova.fact)
  get_filename_component(_name ${_link} NAME)
  get_filename_component(_folder ${CPACK_TEMPORARY_INSTALL_DIRECTORY}/${_link} DIRECTORY)
  file(MAKE_DIRECTORY ${_folder})
  file(CREATE_LINK ${CPACK_PACKAGING_INSTALL_PREFIX}/bin/${_name}
    ${CPACK_TEMPORARY_INSTALL_DIRECTORY}/${_link} SYMBOLIC)
endforeach()
