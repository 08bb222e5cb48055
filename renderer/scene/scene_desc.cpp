#include "renderer/scene/scene_desc.h"
