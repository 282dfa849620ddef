#pragma once

namespace CoreGL {

class OrvanLogger { };
class ConsoleLogger { };
class NOPLogger { };

}
