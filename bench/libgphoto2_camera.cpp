// SPDX-License-Identifier: MIT
#include "libgphoto2_camera.h"

#include <stdexcept>

namespace brivo::bench {

namespace {

constexpr const char* kModel = "Mass Storage Camera";

/// What the library returned, when that is no error.
int checked(int result) {
  if (result < GP_OK) throw std::runtime_error(std::string("libgphoto2: ") + ::gp_result_as_string(result));
  return result;
}

/// A new object of the library and the function that lets go of it.
template <class T>
std::unique_ptr<T, int (*)(T*)> made(int (*make)(T**), int (*release)(T*)) {
  T* object = nullptr;
  checked(make(&object));
  return {object, release};
}

}  // namespace

Libgphoto2Camera::Libgphoto2Camera(const std::string& card, const std::string& folder)
    : folder_(folder), context_(::gp_context_new()) {
  Camera* camera = nullptr;
  checked(::gp_camera_new(&camera));
  camera_.reset(camera);
  chooseModel();
  choosePort("disk:" + card);
  checked(::gp_camera_init(camera_.get(), context_.get()));
  list();
}

void Libgphoto2Camera::chooseModel() const {
  const auto list = made(&::gp_abilities_list_new, &::gp_abilities_list_free);
  checked(::gp_abilities_list_load(list.get(), context_.get()));
  CameraAbilities abilities;
  const int index = checked(::gp_abilities_list_lookup_model(list.get(), kModel));
  checked(::gp_abilities_list_get_abilities(list.get(), index, &abilities));
  checked(::gp_camera_set_abilities(camera_.get(), abilities));
}

void Libgphoto2Camera::choosePort(const std::string& path) const {
  const auto list = made(&::gp_port_info_list_new, &::gp_port_info_list_free);
  checked(::gp_port_info_list_load(list.get()));
  GPPortInfo port;
  const int index = checked(::gp_port_info_list_lookup_path(list.get(), path.c_str()));
  checked(::gp_port_info_list_get_info(list.get(), index, &port));
  checked(::gp_camera_set_port_info(camera_.get(), port));
}

void Libgphoto2Camera::list() const {
  const auto names = made(&::gp_list_new, &::gp_list_free);
  checked(::gp_camera_folder_list_files(camera_.get(), folder_.c_str(), names.get(), context_.get()));
}

std::string Libgphoto2Camera::thumbnail(const std::string& name) const {
  const auto file = made(&::gp_file_new, &::gp_file_unref);
  checked(::gp_camera_file_get(camera_.get(), folder_.c_str(), name.c_str(), GP_FILE_TYPE_PREVIEW, file.get(),
                               context_.get()));
  const char* bytes = nullptr;
  unsigned long size = 0;
  checked(::gp_file_get_data_and_size(file.get(), &bytes, &size));
  return {bytes, size};
}

}  // namespace brivo::bench
